// SPDX-License-Identifier: Apache-2.0
#include "quarn/character/PlainAccessors.h"

#include "quarn/character/gltfTypes.h"
#include "quarn/character/gltfValues.h"
#include "storage/encodings.h"

namespace quarn {

PlainAccessors::PlainAccessors(storage::JsonDocument& document, GltfBytes& bytes)
    : document_(document)
    , bytes_(bytes)
    , buffer_(listOf(document, "buffers").Size()) {}

unsigned PlainAccessors::add(const char* type, std::uint64_t componentType, std::uint64_t count,
                             const std::string& bytes) {
    auto& memory = document_.GetAllocator();
    const auto append = [&](const char* key, JsonValue& value) {
        JsonValue& values = arrayMember(document_, key, document_);
        values.PushBack(value, memory);
        return values.Size() - 1;
    };
    JsonValue view(rapidjson::kObjectType);
    view.AddMember("buffer", buffer_, memory);
    view.AddMember("byteOffset", std::uint64_t{data_.size()}, memory);
    view.AddMember("byteLength", std::uint64_t{bytes.size()}, memory);
    data_ += bytes;
    data_.resize((data_.size() + 3) / 4 * 4); // numbers lie at multiples of their size
    JsonValue accessor(rapidjson::kObjectType);
    accessor.AddMember("bufferView", append("bufferViews", view), memory);
    accessor.AddMember("componentType", componentType, memory);
    accessor.AddMember("type", JsonValue(type, memory), memory);
    accessor.AddMember("count", count, memory);
    return append("accessors", accessor);
}

unsigned PlainAccessors::changed(std::size_t index, bool whole) {
    const JsonValue& from = listOf(document_, "accessors")[static_cast<rapidjson::SizeType>(index)];
    const std::string type = textOf(from, "type");
    const std::uint64_t count = sizeOf(from, "count", 0, "");
    if (whole)
        return add(type.c_str(), sizeOf(from, "componentType", 0, ""), count, packedValues(document_, index, bytes_));
    const std::vector<float> values = floatValues(document_, index, bytes_);
    return add(type.c_str(), gltfComponent::single, count,
               std::string(reinterpret_cast<const char*>(values.data()), values.size() * sizeof(float)));
}

void PlainAccessors::makePlain(JsonValue& index, bool whole) {
    const std::size_t accessor = index.GetUint();
    const JsonValue& from = listOf(document_, "accessors")[index.GetUint()];
    if (isStoredPlainly(document_, accessor) &&
        (whole || sizeOf(from, "componentType", 0, "") == gltfComponent::single))
        return;
    const auto [place, isNew] = done_.try_emplace({accessor, whole});
    if (isNew)
        place->second = changed(accessor, whole);
    index.SetUint(place->second);
}

void PlainAccessors::finish() {
    if (data_.empty())
        return;
    auto& memory = document_.GetAllocator();
    const std::string uri = "data:application/octet-stream;base64," + storage::base64(data_);
    JsonValue buffer(rapidjson::kObjectType);
    buffer.AddMember("byteLength", std::uint64_t{data_.size()}, memory);
    buffer.AddMember("uri", JsonValue(uri.c_str(), memory), memory);
    arrayMember(document_, "buffers", document_).PushBack(buffer, memory);
}

} // namespace quarn
