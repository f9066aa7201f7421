// SPDX-License-Identifier: Apache-2.0
#include "quarn/character/importedFile.h"

#include "quarn/character/filesBeside.h"

#include <assimp/MemoryIOWrapper.h>

#include <utility>

namespace quarn {

ImportedFile::ImportedFile(std::string path, const std::string& bytes)
    : path_(std::move(path))
    , bytes_(bytes) {}

// the importer takes a URI for a path: behind its own folder, which is one, characters may be written by their codes
std::string ImportedFile::onDisk(const std::string& file) const {
    const std::string folder = folderOf(path_);
    return file.starts_with(folder) ? fileOfUri(path_, file.substr(folder.size())) : file;
}

bool ImportedFile::Exists(const char* file) const {
    return file == path_ || isFile(onDisk(file));
}

Assimp::IOStream* ImportedFile::Open(const char* file, const char* mode) {
    if (file != path_)
        return Exists(file) ? DefaultIOSystem::Open(onDisk(file).c_str(), mode) : nullptr; // a pipe would be waited for
    // the stream does not own the bytes and does not write
    const auto* bytes = reinterpret_cast<const std::uint8_t*>(bytes_.data());
    return new Assimp::MemoryIOStream(bytes, bytes_.size(), false);
}

} // namespace quarn
