// SPDX-License-Identifier: Apache-2.0
// The foundation arrays: the form in which whole buffers are handed to the host (TapiCastAnim.h).
#pragma once

#include "openquarn/HMatrix.h"

#include <cstddef>
#include <cstdint>
#include <vector>

/// Three floats, packed: 12 bytes.
struct T3dFltVector {
    float x = 0.0F;
    float y = 0.0F;
    float z = 0.0F;
    bool operator==(const T3dFltVector& other) const noexcept { return x == other.x && y == other.y && z == other.z; }
    bool operator!=(const T3dFltVector& other) const noexcept { return !(*this == other); }
};
/// Sixteen doubles, row-major, for row vectors: 128 bytes.
using T4dDblMatrix = HMatrix;

static_assert(sizeof(T3dFltVector) == 12 && sizeof(T4dDblMatrix) == 128, "buffers are read as packed numbers");

/// Elements one after the other in memory, owned. Constructing, copying and appending throw std::bad_alloc or
/// std::length_error in the caller when there is no memory. `[any]`; one array is for one thread at a time, but
/// different elements may be written by different threads.
template <class Element>
class TArray {
public:
    using value_type = Element;

    TArray() = default;
    /// Memory for `initialCapacity` elements, or for `length` where that is more, and `length` default elements (0; the
    /// identity for matrices).
    TArray(std::size_t initialCapacity, std::size_t length) {
        elements_.reserve(initialCapacity < length ? length : initialCapacity);
        elements_.resize(length);
    }

    std::size_t length() const noexcept { return elements_.size(); }
    /// Not checked: `index` is below length().
    Element& operator[](std::size_t index) noexcept { return elements_[index]; }
    const Element& operator[](std::size_t index) const noexcept { return elements_[index]; }
    /// length() elements; valid until the array grows or is destroyed. May be null when it has no capacity.
    Element* data() noexcept { return elements_.data(); }
    const Element* data() const noexcept { return elements_.data(); }
    auto begin() noexcept { return elements_.begin(); }
    auto end() noexcept { return elements_.end(); }
    auto begin() const noexcept { return elements_.begin(); }
    auto end() const noexcept { return elements_.end(); }
    /// Adds one element at the end; the memory grows by doubling.
    void append(const Element& element) { elements_.push_back(element); }

private:
    std::vector<Element> elements_;
};

using TfloatArray = TArray<float>;
using TuInt32Array = TArray<std::uint32_t>;
using T3dFltVectorArray = TArray<T3dFltVector>;
using T4dDblMatrixArray = TArray<T4dDblMatrix>;
