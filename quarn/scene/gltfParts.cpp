// SPDX-License-Identifier: Apache-2.0
// Source: the glTF 2.0 specification of the Khronos Group: accessors, and the GLB container (a header of 12 bytes, then
// a JSON and a binary chunk, each padded to a multiple of 4).
#include "quarn/scene/gltfParts.h"

#include <algorithm>
#include <limits>
#include <ostream>
#include <stdexcept>

namespace quarn {
namespace {

void putNumber(std::ostream& out, std::size_t number) {
    const auto value = static_cast<std::uint32_t>(number);
    out.write(reinterpret_cast<const char*>(&value), sizeof value);
}

} // namespace

void writeGltfAsset(JsonWriter& json) {
    json.Key("asset");
    json.StartObject();
    writeText(json, "version", "2.0");
    writeText(json, "generator", "quarn " QUARN_VERSION);
    json.EndObject();
}

void writeGltfBox(JsonWriter& json, std::span<const float> numbers, std::size_t width) {
    for (const bool isMin : {true, false}) {
        json.Key(isMin ? "min" : "max");
        json.StartArray();
        for (std::size_t axis = 0; axis < width; ++axis) {
            float extreme = numbers[axis];
            for (std::size_t i = axis; i < numbers.size(); i += width)
                extreme = isMin ? std::min(extreme, numbers[i]) : std::max(extreme, numbers[i]);
            json.Double(static_cast<double>(extreme));
        }
        json.EndArray();
    }
}

void writeGlb(std::ostream& out, std::string json, std::span<const std::string_view> numbers) {
    json.resize((json.size() + 3) / 4 * 4, ' ');
    std::size_t length = 0;
    for (const std::string_view part : numbers)
        length += part.size();
    const std::size_t whole = 12 + 8 + json.size() + 8 + length;
    if (whole > std::numeric_limits<std::uint32_t>::max())
        throw std::runtime_error("its " + std::to_string(whole) + " bytes are more than a .glb has room for");
    out << "glTF";
    putNumber(out, 2);
    putNumber(out, whole);
    putNumber(out, json.size());
    out << "JSON" << json;
    putNumber(out, length);
    out.write("BIN\0", 4);
    for (const std::string_view part : numbers)
        out << part;
}

} // namespace quarn
