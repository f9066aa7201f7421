// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <array>
#include <cstddef>
#include <cstdint>

/// A program that is linked with watchedNew.cpp notes the large allocations of the thread that asks for it, and can
/// have one of them fail, or all. It throws when malloc has nothing, where the address sanitizer's own operator new
/// would end the process.
struct AllocationWatch {
    std::size_t threshold = SIZE_MAX; ///< bytes from which on an allocation is large
    std::size_t refused = 0;          ///< the number of the one that fails, from 1; 0: none
    std::size_t count = 0;
    std::array<std::size_t, 64> sizes{}; ///< of the first ones
    bool refusesAll = false;
};
extern thread_local AllocationWatch watch;
