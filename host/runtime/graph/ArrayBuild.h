// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "graph/Slot.h"

namespace OpenQuarn {

/// Elements that an array data builder adds and removes, until they are set into the array.
struct ArrayBuild {
    std::shared_ptr<Slot> array;
    SparseArray<Slot> added;
    SparseArray<Slot> removed; ///< elements of the array

    /// The element, made when the array will not have it. Kept elements are the array's own.
    std::shared_ptr<Slot> add(unsigned index);
    /// False when the array will not have it.
    bool remove(unsigned index);
    /// Number of elements that the array will have.
    std::size_t size() const;
};

/// Makes it so. Elements that go lose their connections.
void commit(ArrayBuild& build);

} // namespace OpenQuarn
