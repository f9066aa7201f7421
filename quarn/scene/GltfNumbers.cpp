// SPDX-License-Identifier: Apache-2.0
#include "quarn/scene/GltfNumbers.h"

#include "quarn/scene/gltfParts.h"

#include <algorithm>
#include <array>
#include <limits>
#include <stdexcept>

namespace quarn {
namespace {

struct ShapeText {
    const char* name;
    std::size_t numbers;
};

ShapeText textOf(GltfNumbers::Shape shape) {
    constexpr std::array<ShapeText, 5> texts = {{{"SCALAR", 1}, {"VEC2", 2}, {"VEC3", 3}, {"VEC4", 4}, {"MAT4", 16}}};
    return texts.at(static_cast<std::size_t>(shape));
}

void writeNumbers(JsonWriter& json, const char* key, const std::vector<float>& numbers) {
    if (numbers.empty())
        return;
    json.Key(key);
    json.StartArray();
    for (const float number : numbers)
        json.Double(static_cast<double>(number));
    json.EndArray();
}

} // namespace

std::size_t GltfNumbers::append(std::string_view bytes, std::size_t numberBytes, unsigned component, const Kind& kind) {
    constexpr std::size_t most = std::numeric_limits<std::uint32_t>::max() / 2;
    if (bytes.size() > most - bytes_.size())
        throw std::runtime_error("its " + std::to_string(bytes_.size() + bytes.size()) +
                                 " bytes of numbers are more than a glTF file is to hold");
    Accessor accessor;
    accessor.offset = bytes_.size();
    accessor.length = bytes.size();
    accessor.count = bytes.size() / numberBytes / textOf(kind.shape).numbers;
    accessor.component = component;
    accessor.kind = kind;
    bytes_.append(bytes);
    bytes_.resize((bytes_.size() + 3) / 4 * 4, '\0');
    accessors_.push_back(std::move(accessor));
    return accessors_.size() - 1;
}

std::size_t GltfNumbers::add(std::span<const float> numbers, const Kind& kind) {
    const std::size_t index = append(bytesOf(numbers), sizeof(float), gltfFloat, kind);
    if (!kind.bounded || numbers.empty())
        return index;
    Accessor& accessor = accessors_[index];
    const std::size_t width = textOf(kind.shape).numbers;
    accessor.least.assign(numbers.begin(), numbers.begin() + static_cast<std::ptrdiff_t>(width));
    accessor.largest = accessor.least;
    for (std::size_t i = 0; i < numbers.size(); ++i) {
        accessor.least[i % width] = std::min(accessor.least[i % width], numbers[i]);
        accessor.largest[i % width] = std::max(accessor.largest[i % width], numbers[i]);
    }
    return index;
}

std::size_t GltfNumbers::add(std::span<const std::uint32_t> numbers, const Kind& kind) {
    return append(bytesOf(numbers), sizeof(std::uint32_t), gltfUnsigned, kind);
}

std::size_t GltfNumbers::add(std::span<const std::uint16_t> numbers, const Kind& kind) {
    constexpr unsigned unsignedShort = 5123;
    return append(bytesOf(numbers), sizeof(std::uint16_t), unsignedShort, kind);
}

void GltfNumbers::write(JsonWriter& json, const std::string& uri) const {
    json.Key("accessors");
    json.StartArray();
    for (std::size_t i = 0; i < accessors_.size(); ++i) {
        json.StartObject();
        writeCount(json, "bufferView", i);
        writeCount(json, "componentType", accessors_[i].component);
        writeCount(json, "count", accessors_[i].count);
        writeText(json, "type", textOf(accessors_[i].kind.shape).name);
        writeNumbers(json, "min", accessors_[i].least);
        writeNumbers(json, "max", accessors_[i].largest);
        json.EndObject();
    }
    json.EndArray();
    json.Key("bufferViews");
    json.StartArray();
    for (const Accessor& accessor : accessors_) {
        json.StartObject();
        writeCount(json, "buffer", 0);
        writeCount(json, "byteOffset", accessor.offset);
        writeCount(json, "byteLength", accessor.length);
        if (accessor.kind.use != Use::plain)
            writeCount(json, "target", accessor.kind.use == Use::vertices ? gltfVertexBuffer : gltfIndexBuffer);
        json.EndObject();
    }
    json.EndArray();
    json.Key("buffers");
    json.StartArray();
    json.StartObject();
    writeCount(json, "byteLength", bytes_.size());
    if (!uri.empty())
        writeText(json, "uri", uri);
    json.EndObject();
    json.EndArray();
}

} // namespace quarn
