// SPDX-License-Identifier: Apache-2.0
#include "storage/CacheLayout.h"

#include <stdexcept>
#include <string>

namespace storage {

FileBytes pointsOf(const CacheLayout& layout, const FileBytes& file, std::uint64_t from) {
    const std::uint64_t there = from < file.size ? file.size - from : 0;
    std::uint64_t needed = 0;
    const bool overflows = __builtin_mul_overflow(layout.vertices, 3 * layout.scalarSize, &needed) ||
                           __builtin_mul_overflow(needed, layout.frames, &needed);
    if (!overflows && needed == there)
        return file.part(file.size - there, there);
    throw std::runtime_error((overflows || needed > there ? "it is cut short: " : "it has more than its array: ") +
                             ("its shape is [" + std::to_string(layout.frames) + ", " +
                              std::to_string(layout.vertices) + ", 3] of " + std::to_string(layout.scalarSize) +
                              " bytes each, and " + std::to_string(there) + " bytes follow the header"));
}

} // namespace storage
