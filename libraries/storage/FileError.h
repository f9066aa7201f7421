// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <filesystem>
#include <stdexcept>
#include <string>

namespace storage {

/// What a file could not be used for. what() is a sentence for the user that begins with the path.
class FileError : public std::runtime_error {
public:
    /// `predicate` what follows the path, as in "could not be written: Permission denied".
    FileError(const std::filesystem::path& path, const std::string& predicate);
    FileError(const FileError&) = default;
    FileError& operator=(const FileError&) = default;
    ~FileError() override;

    /// The sentence without the path, for who names the file another way.
    const std::string& predicate() const { return predicate_; }

private:
    std::string predicate_;
};

/// The system's text for an errno.
std::string textOfErrno(int error);

/// Throws that the file "could not be written", with the reason.
[[noreturn]] void failToWrite(const std::filesystem::path& path, const std::string& reason);
[[noreturn]] void failToWrite(const std::filesystem::path& path, int error);

} // namespace storage
