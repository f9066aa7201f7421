// SPDX-License-Identifier: Apache-2.0
// A short sum of bytes that tells damage and change from what was there before; it is no protection against intent.
//
// Source: FNV-1a with 64 bits, as its authors Fowler, Noll and Vo give it.
#pragma once

#include <cstddef>
#include <cstdint>
#include <span>
#include <string>

namespace storage {

/// Thread: one at a time.
class Fnv64 {
public:
    void add(std::span<const std::byte> bytes) {
        for (const std::byte byte : bytes)
            value_ = (value_ ^ std::to_integer<std::uint64_t>(byte)) * 1099511628211U;
    }
    std::uint64_t value() const { return value_; }
    /// 16 hexadecimal digits.
    std::string text() const {
        std::string digits(16, '0');
        std::uint64_t rest = value_;
        for (auto digit = digits.rbegin(); digit != digits.rend(); ++digit, rest >>= 4U)
            *digit = "0123456789abcdef"[rest & 15U];
        return digits;
    }

private:
    std::uint64_t value_ = 14695981039346656037U;
};

} // namespace storage
