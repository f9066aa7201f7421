// SPDX-License-Identifier: Apache-2.0
// The scene file that is open, and whether it is being read at the moment.
#pragma once

#include <string>

namespace OpenQuarn {

/// Path of the scene file, as it was given; "" for none. Thread: any.
std::string currentSceneFile();
/// Absolute; empty for a scene without a file. Thread: any.
std::string currentSceneFolder();
/// The folder that a scene in that file has. Throws when it counts from a current directory that is gone. Thread: any.
std::string folderOfScene(const std::string& file);
/// `path` counts from the caller's folder; "" for none. Tells the application of the folder (setSceneFolderSink).
/// Thread: main.
void setCurrentSceneFile(std::string path);
/// The scene goes to another folder before its file does; empty for none. Tells the application. Thread: main.
void setCurrentSceneFolder(const std::string& folder);

/// What the functions above answer of one scene.
struct SceneFileNames {
    std::string path;
    std::string folder;
};
/// Another scene becomes the current one: its names take the place of the present ones, which are given back. Tells the
/// application of a folder that is another. Thread: main.
SceneFileNames exchangeSceneFile(SceneFileNames names);

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
