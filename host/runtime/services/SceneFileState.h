// SPDX-License-Identifier: Apache-2.0
// The scene file that is open, and whether it is being read at the moment.
#pragma once

#include <string>

namespace OpenQuarn {

/// Path of the scene file; "" for none. Thread: any.
std::string currentSceneFile();
void setCurrentSceneFile(std::string path);

/// Version of the scene file that is being read; -1 when none is. Thread: any.
int readingFileVersion() noexcept;

/// A scene file of that version is being read while one of these lives; the scene reader holds one. They nest, for a
/// file that is read from within another. Thread: main.
class ReadingSceneFile {
public:
    explicit ReadingSceneFile(int version) noexcept;
    ~ReadingSceneFile();
    ReadingSceneFile(const ReadingSceneFile&) = delete;
    ReadingSceneFile& operator=(const ReadingSceneFile&) = delete;

private:
    int previous_;
};

} // namespace OpenQuarn
