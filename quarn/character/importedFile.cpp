// SPDX-License-Identifier: Apache-2.0
#include "quarn/character/importedFile.h"

#include <assimp/MemoryIOWrapper.h>

#include <filesystem>
#include <system_error>
#include <utility>

namespace quarn {

ImportedFile::ImportedFile(std::string path, const std::string& bytes)
    : path_(std::move(path))
    , bytes_(bytes) {}

bool ImportedFile::Exists(const char* file) const {
    std::error_code error;
    return file == path_ || std::filesystem::is_regular_file(file, error);
}

Assimp::IOStream* ImportedFile::Open(const char* file, const char* mode) {
    if (file != path_)
        return Exists(file) ? DefaultIOSystem::Open(file, mode) : nullptr; // a pipe would be waited for
    // the stream does not own the bytes and does not write
    const auto* bytes = reinterpret_cast<const std::uint8_t*>(bytes_.data());
    return new Assimp::MemoryIOStream(bytes, bytes_.size(), false);
}

} // namespace quarn
