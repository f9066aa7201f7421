// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstddef>
#include <memory>
#include <type_traits>
#include <typeindex>
#include <utility>
#include <vector>

namespace quill {

/// The one of all living arrays of this content, which is `array` itself where there was none (decision 0186). Compares
/// every byte. Throws std::bad_alloc. [any]
///   array  owns the `size` bytes, which nobody writes to any more
///   type   of the elements: others are never the same
std::shared_ptr<const void> sharedContent(std::shared_ptr<const void> array, const void* bytes, std::size_t size,
                                          std::type_index type);

/// An array that does not change, held once in the process however many hold one of the same bytes. To be read like the
/// vector that it was made of; copies cost nothing. A plain value: different objects on different threads. The elements
/// go with the last object that holds them.
template <typename T>
class SharedArray {
public:
    SharedArray() = default;
    /// Throws std::bad_alloc.
    SharedArray(std::vector<T> values) { // NOLINT(google-explicit-constructor): it stands for its values
        static_assert(std::is_trivially_copyable_v<T>);
        if (values.empty())
            return;
        const auto own = std::make_shared<const std::vector<T>>(std::move(values));
        values_ = std::static_pointer_cast<const std::vector<T>>(
            sharedContent(own, own->data(), own->size() * sizeof(T), typeid(T)));
    }

    operator const std::vector<T>&() const { return get(); } // NOLINT(google-explicit-constructor): likewise
    const std::vector<T>& get() const {
        static const std::vector<T> none;
        return values_ ? *values_ : none;
    }
    const T* data() const { return get().data(); }
    std::size_t size() const { return get().size(); }
    std::size_t capacity() const { return get().capacity(); }
    bool empty() const { return !values_; }
    const T& operator[](std::size_t i) const { return (*values_)[i]; }

private:
    std::shared_ptr<const std::vector<T>> values_; // null: empty
};

} // namespace quill
