// SPDX-License-Identifier: Apache-2.0
#include "watchedNew.h"

#include <cstdlib>
#include <new>

thread_local AllocationWatch watch;

namespace {

void* watchedAllocation(std::size_t size) {
    if (size >= watch.threshold) {
        if (watch.count < watch.sizes.size())
            watch.sizes[watch.count] = size;
        if (++watch.count == watch.refused || watch.refusesAll)
            return nullptr;
    }
    return std::malloc(size == 0 ? 1 : size);
}

} // namespace

void* operator new(std::size_t size) {
    if (void* memory = watchedAllocation(size))
        return memory;
    throw std::bad_alloc();
}
void* operator new[](std::size_t size) {
    return operator new(size);
}
void* operator new(std::size_t size, const std::nothrow_t&) noexcept {
    return watchedAllocation(size);
}
void* operator new[](std::size_t size, const std::nothrow_t&) noexcept {
    return watchedAllocation(size);
}
void operator delete(void* memory) noexcept {
    std::free(memory);
}
void operator delete[](void* memory) noexcept {
    std::free(memory);
}
void operator delete(void* memory, std::size_t) noexcept {
    std::free(memory);
}
void operator delete[](void* memory, std::size_t) noexcept {
    std::free(memory);
}
void operator delete(void* memory, const std::nothrow_t&) noexcept {
    std::free(memory);
}
void operator delete[](void* memory, const std::nothrow_t&) noexcept {
    std::free(memory);
}
