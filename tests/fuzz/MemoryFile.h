// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "require.h"

#include <cstddef>
#include <cstdint>
#include <string>

#include <sys/mman.h>
#include <unistd.h>

/// A file in memory, with a path, for readers that take one.
class MemoryFile {
public:
    MemoryFile(const std::uint8_t* data, std::size_t size)
        : descriptor_(memfd_create("fuzz", MFD_CLOEXEC)) {
        require(descriptor_ >= 0 && write(descriptor_, data, size) == static_cast<ssize_t>(size));
    }
    ~MemoryFile() { close(descriptor_); }
    MemoryFile(const MemoryFile&) = delete;
    MemoryFile& operator=(const MemoryFile&) = delete;
    std::string path() const { return "/proc/self/fd/" + std::to_string(descriptor_); }

private:
    int descriptor_;
};
