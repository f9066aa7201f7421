// SPDX-License-Identifier: Apache-2.0
#include "limitedNew.h"

#include <cstdint>
#include <cstdlib>
#include <new>

std::size_t refusedAllocation = SIZE_MAX;

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
