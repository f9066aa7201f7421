// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "storage/Descriptor.h"

#include <cstdint>
#include <filesystem>

namespace storage {

/// A regular file that is open.
struct OpenFile {
    Descriptor descriptor;
    std::uint64_t size = 0; ///< as the system says; files of the system have none
};

/// Opens a regular file of at most `most` bytes. Anything else (a folder, a FIFO that would wait for a writer, a device
/// that would never end) and anything larger is refused. Throws FileError, which names the path, the reason, and both
/// sizes. Thread: any.
OpenFile openToRead(const std::filesystem::path& path, std::uint64_t most);

/// Throws that a file has `size` bytes, which are too many.
[[noreturn]] void refuseSize(const std::filesystem::path& path, const std::string& size, std::uint64_t most);
/// Throws that a file "cannot be read", with the system's reason.
[[noreturn]] void failToRead(const std::filesystem::path& path, int error);

} // namespace storage
