// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstdint>
#include <filesystem>
#include <string>

namespace quarn {

/// Throws, with both numbers, unless the disk of a folder has room for so many bytes and 1 MiB more, for texts and what
/// the file system needs for itself. `what` is to be written, as in "the data set".
void requireRoom(const std::filesystem::path& folder, std::uint64_t bytes, const std::string& what);

} // namespace quarn
