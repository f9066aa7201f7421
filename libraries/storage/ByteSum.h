// SPDX-License-Identifier: Apache-2.0
// A sum of bytes that tells them from any others; it is no protection against intent.
#pragma once

#include <cstddef>
#include <memory>
#include <span>
#include <string>

namespace storage {

/// XXH3 with 128 bits. Thread: one at a time.
class ByteSum {
public:
    /// Of no bytes. Throws std::bad_alloc.
    ByteSum();
    ~ByteSum();
    ByteSum(const ByteSum&) = delete;
    ByteSum& operator=(const ByteSum&) = delete;

    void add(std::span<const std::byte> bytes);
    /// 32 hexadecimal digits, the highest first.
    std::string digits() const;

private:
    struct State; // keeps the library's header out of every includer
    std::unique_ptr<State> state_;
};

} // namespace storage
