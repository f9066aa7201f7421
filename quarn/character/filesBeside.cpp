// SPDX-License-Identifier: Apache-2.0
#include "quarn/character/filesBeside.h"

#include "storage/FileError.h"
#include "storage/readWholeFile.h"

#include <algorithm>
#include <charconv>
#include <cstdint>
#include <filesystem>
#include <stdexcept>
#include <system_error>

namespace quarn {
namespace {

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

} // namespace

bool isFile(const std::string& path) {
    std::error_code error;
    return std::filesystem::is_regular_file(path, error);
}

std::string folderOf(const std::string& path) {
    return path.substr(0, path.size() - std::filesystem::path(path).filename().string().size());
}

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

bool leavesFolder(const std::string& uri) {
    // as it is written, and as fileOfUri() may take it
    for (const std::string& text : {uri, percentDecoded(uri)}) {
        const std::filesystem::path path(text);
        if (path.is_absolute() || text.find_first_of(":\\") != std::string::npos ||
            std::find(path.begin(), path.end(), "..") != path.end())
            return true;
    }
    return false;
}

} // namespace quarn
