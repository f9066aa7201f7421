// SPDX-License-Identifier: Apache-2.0
// Whole files: read at once, replaced at once.
#pragma once

#include <filesystem>
#include <string>
#include <string_view>

namespace OpenQuarn {

/// The bytes of a regular file. Throws std::runtime_error with the reason, without the file's name.
std::string readFile(const std::filesystem::path& path);

/// Puts a file with these bytes in the place of `path`: written beside it, flushed to the disk, then renamed, so that
/// there is the old file or the new one at any moment. The new file has the permissions of the old one, and its group
/// where the system allows it; a symbolic link stays, and what it leads to is replaced. Throws std::runtime_error with
/// the reason, without the file's name; the old file is as it was then, and nothing is left beside it.
void replaceFile(const std::filesystem::path& path, std::string_view bytes);

} // namespace OpenQuarn
