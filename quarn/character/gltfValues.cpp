// SPDX-License-Identifier: Apache-2.0
#include "quarn/character/gltfValues.h"

#include "quarn/character/gltfTypes.h"

#include <algorithm>
#include <cstring>
#include <limits>
#include <type_traits>

namespace quarn {
namespace {

const JsonValue& accessorAt(const JsonValue& document, std::size_t index) {
    return listOf(document, "accessors")[static_cast<rapidjson::SizeType>(index)];
}

const JsonValue& viewAt(const JsonValue& document, std::uint64_t index) {
    return listOf(document, "bufferViews")[static_cast<rapidjson::SizeType>(index)];
}

template <class Value>
Value valueAt(std::string_view bytes, std::size_t index) {
    Value value;
    std::memcpy(&value, bytes.data() + index * sizeof value, sizeof value);
    return value;
}

std::uint64_t wholeAt(std::string_view bytes, std::uint64_t componentType, std::size_t index) {
    if (componentType == gltfComponent::unsignedByte)
        return valueAt<std::uint8_t>(bytes, index);
    if (componentType == gltfComponent::unsignedShort)
        return valueAt<std::uint16_t>(bytes, index);
    return valueAt<std::uint32_t>(bytes, index);
}

// the glTF 2.0 specification, 3.11 "Animations": how whole numbers stand for -1 ... 1
template <class Stored>
std::vector<float> numbers(std::string_view bytes, bool normalized) {
    std::vector<float> values(bytes.size() / sizeof(Stored));
    constexpr double largest = static_cast<double>(std::numeric_limits<Stored>::max());
    for (std::size_t i = 0; i < values.size(); ++i) {
        const auto stored = static_cast<double>(valueAt<Stored>(bytes, i));
        values[i] = static_cast<float>(normalized ? std::max(stored / largest, -1.0) : stored);
    }
    return values;
}

class AccessorPacker {
public:
    AccessorPacker(const JsonValue& document, std::size_t accessor, GltfBytes& bytes)
        : document_(document)
        , accessor_(accessorAt(document, accessor))
        , owner_(element("accessors", accessor))
        , bytes_(bytes)
        , count_(sizeOf(accessor_, "count", 0, owner_))
        , size_(componentBytes(sizeOf(accessor_, "componentType", 0, owner_), owner_) *
                componentCount(accessor_, owner_)) {}

    std::string pack() {
        bytes_.charge(count_ * size_);
        std::string values(count_ * size_, '\0');
        if (count_ == 0)
            return values;
        if (const JsonValue* view = member(accessor_, "bufferView"))
            copyView(view->GetUint64(), values);
        if (const JsonValue* sparse = member(accessor_, "sparse"))
            putSparse(*sparse, values);
        return values;
    }

private:
    void copyView(std::uint64_t view, std::string& values) {
        const std::uint64_t stride = sizeOf(viewAt(document_, view), "byteStride", size_, owner_);
        const std::string_view from = bytes_.view(view).substr(sizeOf(accessor_, "byteOffset", 0, owner_));
        for (std::uint64_t i = 0; i < count_; ++i)
            std::memcpy(values.data() + i * size_, from.data() + i * stride, size_);
    }

    std::string_view sparsePart(const JsonValue& part) {
        return bytes_.view(member(part, "bufferView")->GetUint64()).substr(sizeOf(part, "byteOffset", 0, owner_));
    }

    void putSparse(const JsonValue& sparse, std::string& values) {
        const std::uint64_t changes = sizeOf(sparse, "count", 0, owner_);
        if (changes == 0)
            return;
        const std::uint64_t type = sizeOf(sparse["indices"], "componentType", 0, owner_);
        const std::string_view indices = sparsePart(sparse["indices"]);
        const std::string_view changed = sparsePart(sparse["values"]);
        for (std::uint64_t i = 0; i < changes; ++i) {
            const std::uint64_t index = wholeAt(indices, type, i);
            if (index >= count_)
                throw std::runtime_error(owner_ + " changes element " + std::to_string(index) + ", but has " +
                                         std::to_string(count_));
            std::memcpy(values.data() + index * size_, changed.data() + i * size_, size_);
        }
    }

    const JsonValue& document_;
    const JsonValue& accessor_;
    std::string owner_;
    GltfBytes& bytes_;
    std::uint64_t count_;
    std::uint64_t size_; ///< bytes of an element
};

} // namespace

bool isStoredPlainly(const JsonValue& document, std::size_t accessor) {
    const JsonValue& plain = accessorAt(document, accessor);
    const JsonValue* view = member(plain, "bufferView");
    return view != nullptr && member(plain, "sparse") == nullptr &&
           extensionOf(viewAt(document, view->GetUint64()), meshoptExtension) == nullptr;
}

std::string packedValues(const JsonValue& document, std::size_t accessor, GltfBytes& bytes) {
    return AccessorPacker(document, accessor, bytes).pack();
}

std::vector<float> floatValues(const JsonValue& document, std::size_t accessor, GltfBytes& bytes) {
    const std::string packed = packedValues(document, accessor, bytes);
    const JsonValue& from = accessorAt(document, accessor);
    const bool normalized = isNormalized(from);
    const std::uint64_t type = sizeOf(from, "componentType", 0, element("accessors", accessor));
    bytes.charge(packed.size() / componentBytes(type, "") * sizeof(float));
    switch (type) {
    case gltfComponent::signedByte:
        return numbers<std::int8_t>(packed, normalized);
    case gltfComponent::unsignedByte:
        return numbers<std::uint8_t>(packed, normalized);
    case gltfComponent::signedShort:
        return numbers<std::int16_t>(packed, normalized);
    case gltfComponent::unsignedShort:
        return numbers<std::uint16_t>(packed, normalized);
    case gltfComponent::unsignedInt:
        return numbers<std::uint32_t>(packed, normalized);
    default:
        return numbers<float>(packed, false);
    }
}

} // namespace quarn
