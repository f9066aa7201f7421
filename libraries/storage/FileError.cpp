// SPDX-License-Identifier: Apache-2.0
#include "storage/FileError.h"

#include <system_error>

namespace storage {

FileError::FileError(const std::filesystem::path& path, const std::string& predicate)
    : std::runtime_error(path.string() + " " + predicate)
    , predicate_(predicate) {}

FileError::~FileError() = default;

std::string textOfErrno(int error) {
    return std::generic_category().message(error);
}

void failToWrite(const std::filesystem::path& path, const std::string& reason) {
    throw FileError(path, "could not be written: " + reason);
}

void failToWrite(const std::filesystem::path& path, int error) {
    failToWrite(path, textOfErrno(error));
}

} // namespace storage
