// SPDX-License-Identifier: Apache-2.0
// Replaces the program's operator new by one that throws when malloc has nothing, or when more is asked for than
// `refusedAllocation` allows. (The address sanitizer's own would end the process.) Include it in one file of a program.
#pragma once

#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <new>

/// Smallest size in bytes that is refused. Not for several threads at once.
inline std::size_t refusedAllocation = SIZE_MAX;

void* operator new(std::size_t size, const std::nothrow_t&) noexcept {
    return size >= refusedAllocation ? nullptr : std::malloc(size == 0 ? 1 : size);
}
void* operator new(std::size_t size) {
    void* block = operator new(size, std::nothrow);
    if (block == nullptr) {
        throw std::bad_alloc();
    }
    return block;
}
void operator delete(void* block) noexcept {
    std::free(block);
}
void operator delete(void* block, std::size_t) noexcept {
    std::free(block);
}
void operator delete(void* block, const std::nothrow_t&) noexcept {
    std::free(block);
}
