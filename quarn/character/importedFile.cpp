// SPDX-License-Identifier: Apache-2.0
#include "quarn/character/importedFile.h"

#include <assimp/MemoryIOWrapper.h>

#include <utility>

namespace quarn {

ImportedFile::ImportedFile(std::string path, const std::string& bytes)
    : path_(std::move(path))
    , bytes_(bytes) {}

bool ImportedFile::Exists(const char* file) const {
    return file == path_ || DefaultIOSystem::Exists(file);
}

Assimp::IOStream* ImportedFile::Open(const char* file, const char* mode) {
    if (file != path_)
        return DefaultIOSystem::Open(file, mode);
    // the stream does not own the bytes and does not write
    const auto* bytes = reinterpret_cast<const std::uint8_t*>(bytes_.data());
    return new Assimp::MemoryIOStream(bytes, bytes_.size(), false);
}

} // namespace quarn
