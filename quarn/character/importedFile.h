// SPDX-License-Identifier: Apache-2.0
// A file in memory that the importer reads, while what it refers to is read from the disk.
#pragma once

#include <assimp/DefaultIOSystem.h>

#include <string>
#include <vector>

namespace quarn {

/// The files of the importer: `path` has the given bytes, which must live as long; all others are those of
/// the disk, as far as they are files and no pipes or devices.
class ImportedFile : public Assimp::DefaultIOSystem {
public:
    ImportedFile(std::string path, const std::string& bytes);

    bool Exists(const char* file) const override;                        // NOLINT(readability-identifier-naming)
    Assimp::IOStream* Open(const char* file, const char* mode) override; // NOLINT(readability-identifier-naming)

private:
    std::string onDisk(const std::string& file) const;
    std::string path_;
    const std::string& bytes_;
};

} // namespace quarn
