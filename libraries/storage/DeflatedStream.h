// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "storage/FileBytes.h"

#include <cstddef>
#include <cstdint>
#include <memory>
#include <span>

namespace storage {

/// What deflated bytes are unpacked to, once from its beginning to its end. Errors are std::runtime_error with the
/// reason alone. Thread: one at a time.
class DeflatedStream {
public:
    /// Unpacked bytes that come of one packed one, at most (RFC 1951: 258 of two bits, and what a block begins with).
    static constexpr std::uint64_t mostRatio = 1032;

    /// `packed`  to be deflated without a header; read as they are needed.
    explicit DeflatedStream(const FileBytes& packed);
    ~DeflatedStream();
    DeflatedStream(DeflatedStream&&) noexcept;
    DeflatedStream& operator=(DeflatedStream&&) noexcept;

    /// Fills `bytes` with those that follow. Throws when there are not so many, or they are damaged.
    void read(std::span<std::byte> bytes);
    /// Throws unless all has been read.
    void finish();

private:
    struct Stream;
    std::unique_ptr<Stream> stream_;
};

} // namespace storage
