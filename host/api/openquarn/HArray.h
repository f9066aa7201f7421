// SPDX-License-Identifier: Apache-2.0
// The growing arrays of the API: one template, named per element in HDoubleArray.h, HPointArray.h and so on.
#pragma once

#include "openquarn/HApi.h"
#include "openquarn/HStatus.h"

#include <cstddef>
#include <initializer_list>
#include <limits>
#include <type_traits>
#include <vector>

/// The part of the arrays that is in the host: what decides whether a call may go on, and its statuses.
class HArrayBase {
protected:
    enum class Call { setLength, reserve, append, assign };
    /// Success, or why an array cannot be made `length` long.
    OPENQUARN_API static HStatus admit(Call call, std::size_t length) noexcept;
    OPENQUARN_API static HStatus noMemory(Call call, std::size_t length) noexcept;
    OPENQUARN_API static HStatus nullSource(std::size_t count) noexcept;
};

/// Elements one after the other in memory, owned. A length is at most kMaxLength; a call that returns a status fails
/// with kInsufficientMemory, and leaves the array as it was, for a longer one and when there is no memory. Constructing
/// and copying behave as for a container of the standard library: they throw std::bad_alloc or std::length_error in the
/// caller. `[any]`; one array is for one thread at a time, but different elements may be written by different threads.
template <class T>
class HArray : private HArrayBase {
public:
    using value_type = T;
    static constexpr std::size_t kMaxLength = std::numeric_limits<unsigned>::max();

    HArray() = default;
    /// `length` elements equal to `value`.
    explicit HArray(unsigned length, const T& value = T())
        : items_(length, value) {}
    HArray(std::initializer_list<T> values)
        : items_(values) {}

    unsigned length() const noexcept { return static_cast<unsigned>(items_.size()); }
    bool isEmpty() const noexcept { return items_.empty(); }

    /// Not checked: `index` is below length().
    T& operator[](std::size_t index) noexcept { return items_[index]; }
    const T& operator[](std::size_t index) const noexcept { return items_[index]; }
    /// length() elements; valid until the array grows, is assigned or destroyed. May be null when it is empty.
    T* data() noexcept { return items_.data(); }
    const T* data() const noexcept { return items_.data(); }
    auto begin() noexcept { return items_.begin(); }
    auto end() noexcept { return items_.end(); }
    auto begin() const noexcept { return items_.begin(); }
    auto end() const noexcept { return items_.end(); }

    /// Keeps the elements that fit; new ones are default values (0, an empty text, the origin, a null handle). The
    /// memory of a shortened array is kept for later.
    HStatus setLength(std::size_t length) noexcept {
        return change(Call::setLength, length, [&] { items_.resize(length); });
    }
    /// Takes memory for `capacity` elements at once, so that appending up to there does not take more.
    HStatus reserve(std::size_t capacity) noexcept {
        return change(Call::reserve, capacity, [&] { items_.reserve(capacity); });
    }
    /// Adds one element at the end; `value` may be an element of the array. The memory grows by doubling.
    HStatus append(const T& value) noexcept {
        return change(Call::append, items_.size() + 1, [&] { items_.push_back(value); });
    }
    /// Becomes a copy of `count` elements at `values`, which may not lie in this array; null only with 0, else
    /// kInvalidParameter.
    HStatus assign(const T* values, std::size_t count) noexcept {
        if (!values && count > 0)
            return nullSource(count);
        return change(Call::assign, count, [&] { replace(values, count); });
    }
    /// Removes all elements; the memory is kept for later.
    void clear() noexcept { items_.clear(); }

    bool operator==(const HArray& other) const { return items_ == other.items_; }
    bool operator!=(const HArray& other) const { return items_ != other.items_; }

private:
    template <class Body>
    HStatus change(Call call, std::size_t length, Body&& body) noexcept {
        if (HStatus status = admit(call, length); status.error())
            return status;
        try {
            body();
        } catch (...) {
            return noMemory(call, length);
        }
        return HStatus::kSuccess;
    }

    void replace(const T* values, std::size_t count) {
        if constexpr (std::is_trivially_copyable_v<T>)
            items_.assign(values, values + count);
        else // copying an element may fail half-way
            std::vector<T>(values, values + count).swap(items_);
    }

    std::vector<T> items_;
};
