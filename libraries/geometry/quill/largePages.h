// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstddef>
#include <vector>

namespace quill {

/// Asks the system to back a range of memory by large pages, where it has any: an array of many megabytes that is read
/// from end to end in every frame then costs no walks through page tables. Only has an effect on memory that nothing
/// was written to yet. A wish that cannot be granted is none: the contents are the same. [any]
void adviseLargePages(const void* memory, std::size_t bytes);

/// Makes `values` an array of `count` new elements, in large pages where it is large. Throws std::bad_alloc; `values`
/// is then empty.
template <typename T>
void resizeInLargePages(std::vector<T>& values, std::size_t count) {
    values = {};
    values.reserve(count);
    adviseLargePages(values.data(), count * sizeof(T));
    values.resize(count);
}

} // namespace quill
