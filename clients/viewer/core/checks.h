// SPDX-License-Identifier: Apache-2.0
// Blocks are not trusted: what is read of them goes through here, once, when a character is opened. Everything throws
// std::runtime_error, which names the block and the value.
#pragma once

#include "viewer/Blocks.h"

#include <cstddef>
#include <cstdint>
#include <initializer_list>
#include <span>
#include <string>
#include <string_view>

namespace viewer {

/// Throws "the block "NAME": WHAT".
[[noreturn]] void refuse(std::string_view block, const std::string& what);

/// The product of counts; the largest number where it is larger than that.
std::uint64_t product(std::initializer_list<std::uint64_t> counts);
/// The sum of the counts of a block; refused above what 32 bits hold.
std::uint32_t total(std::string_view block, std::span<const std::uint32_t> counts);

/// Refuses a block that has not as many numbers as are needed.
void checkCount(std::string_view block, std::size_t has, std::uint64_t needed);
/// Refuses the first index that is not below `end`; `what` says of what there are as many.
void checkBelow(std::string_view block, std::span<const std::uint32_t> indices, std::size_t end, const char* what);
/// Refuses the first number that is infinite or none.
void checkFinite(std::string_view block, std::span<const double> values);
void checkFinite(std::string_view block, std::span<const float> values);

/// The numbers of a block, which have to be `count`.
template <class T>
std::span<const T> arrayOf(const Blocks& blocks, std::string_view name, std::uint64_t count) {
    const std::span<const T> values = blocks.array<T>(name);
    checkCount(name, values.size(), count);
    return values;
}

/// The same, to be kept beyond the blocks.
template <class T>
HeldArray<T> heldArrayOf(const Blocks& blocks, std::string_view name, std::uint64_t count) {
    HeldArray<T> array = blocks.held<T>(name);
    checkCount(name, array.values.size(), count);
    return array;
}

} // namespace viewer
