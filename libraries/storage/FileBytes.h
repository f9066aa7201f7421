// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstddef>
#include <cstdint>
#include <span>
#include <string>

namespace storage {

/// A part of an open file, whose owner is another: what a reader may look at. Errors are std::runtime_error with the
/// reason alone. Several threads may read at the same time. [any]
struct FileBytes {
    int descriptor = -1;
    std::uint64_t start = 0; ///< byte of the file
    std::uint64_t size = 0;  ///< of the part: none of it lies beyond the file's end, as that was when it was opened

    /// Fills `bytes` from byte `from` of the part on. Throws when they are not all there, or the disk fails.
    void read(std::uint64_t from, std::span<std::byte> bytes) const;
    /// `length` bytes, or those that there are from there on.
    std::string text(std::uint64_t from, std::size_t length) const;
    /// `length` bytes from `from` on, which must lie in the part: std::out_of_range otherwise.
    FileBytes part(std::uint64_t from, std::uint64_t length) const;
};

} // namespace storage
