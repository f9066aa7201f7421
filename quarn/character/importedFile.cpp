// SPDX-License-Identifier: Apache-2.0
#include "quarn/character/importedFile.h"

#include "storage/FileError.h"
#include "storage/readWholeFile.h"

#include <assimp/MemoryIOWrapper.h>

#include <charconv>
#include <filesystem>
#include <stdexcept>
#include <system_error>
#include <utility>

namespace quarn {
namespace {

bool isFile(const std::string& path) {
    std::error_code error;
    return std::filesystem::is_regular_file(path, error);
}

// "%20" and the like as the bytes that they stand for; what is none of these, and the byte 0, stays as it is written
std::string percentDecoded(const std::string& uri) {
    std::string decoded;
    for (std::size_t at = 0; at < uri.size(); ++at) {
        const char* digits = uri.data() + at + 1;
        unsigned byte = 0;
        const bool isCode = uri[at] == '%' && at + 2 < uri.size() &&
                            std::from_chars(digits, digits + 2, byte, 16).ptr == digits + 2 && byte != 0;
        decoded += isCode ? static_cast<char>(byte) : uri[at];
        at += isCode ? 2U : 0U;
    }
    return decoded;
}

// the folder of a path, with its separator
std::string folderOf(const std::string& path) {
    return path.substr(0, path.size() - std::filesystem::path(path).filename().string().size());
}

} // namespace

std::string fileOfUri(const std::string& path, const std::string& uri) {
    const std::string folder = folderOf(path);
    std::string decoded = folder + percentDecoded(uri);
    return uri.find('%') != std::string::npos && isFile(decoded) ? decoded : folder + uri;
}

std::string readBeside(const std::string& path, const std::string& uri, const std::string& what) {
    try {
        return storage::readWholeFile(fileOfUri(path, uri), std::uint64_t{1} << 32U);
    } catch (const storage::FileError& error) {
        throw std::runtime_error("its " + what + " \"" + uri + "\" " + error.predicate());
    }
}

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
