// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstdint>
#include <filesystem>
#include <string>

namespace storage {

/// The bytes of a regular file of at most `most` bytes. Anything else (a folder, a FIFO that would wait for a writer, a
/// device that would never end) and anything larger is refused before it is read, and what grows meanwhile is too.
/// Throws FileError, which names the path, the reason, and both sizes. Thread: any.
std::string readWholeFile(const std::filesystem::path& path, std::uint64_t most);

} // namespace storage
