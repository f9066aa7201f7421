// SPDX-License-Identifier: Apache-2.0
#include "quill/largePages.h"

#include <cstdint>

#ifdef __linux__
#include <sys/mman.h>
#endif

namespace quill {

void adviseLargePages([[maybe_unused]] const void* memory, [[maybe_unused]] std::size_t bytes) {
#ifdef __linux__
    constexpr std::uintptr_t page = std::uintptr_t{2} << 20U;
    const auto begin = (reinterpret_cast<std::uintptr_t>(memory) + page - 1) / page * page;
    const auto end = (reinterpret_cast<std::uintptr_t>(memory) + bytes) / page * page;
    if (begin < end)
        madvise(reinterpret_cast<void*>(begin), end - begin, MADV_HUGEPAGE); // NOLINT: an address is computed
#endif
}

} // namespace quill
