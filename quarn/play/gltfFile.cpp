// SPDX-License-Identifier: Apache-2.0
// Source: the glTF 2.0 specification of the Khronos Group: the JSON object, and the GLB container (a header of 12
// bytes, then a JSON and a binary chunk, each padded to a multiple of 4).
#include "quarn/console/json.h"
#include "quarn/play/meshFiles.h"
#include "storage/encodings.h"

#include <algorithm>
#include <limits>
#include <ostream>
#include <stdexcept>
#include <string_view>

namespace quarn {
namespace {

std::vector<std::uint32_t> trianglesOf(const MeshPolygons& polygons) {
    std::vector<std::uint32_t> triangles;
    triangles.reserve(3 * polygons.sizes.size());
    const std::uint32_t* corner = polygons.corners.data();
    for (const std::uint32_t size : polygons.sizes) {
        for (std::uint32_t i = 2; i < size; ++i)
            triangles.insert(triangles.end(), {corner[0], corner[i - 1], corner[i]});
        corner += size;
    }
    return triangles;
}

template <class Numbers>
std::string_view bytesOf(const Numbers& numbers) {
    return {reinterpret_cast<const char*>(numbers.data()), numbers.size() * sizeof(numbers[0])};
}

// the box that glTF wants of positions
void writeBox(JsonWriter& json, std::span<const float> xyz) {
    for (const bool isMin : {true, false}) {
        json.Key(isMin ? "min" : "max");
        json.StartArray();
        for (std::size_t axis = 0; axis < 3; ++axis) {
            float extreme = xyz[axis];
            for (std::size_t i = axis; i < xyz.size(); i += 3)
                extreme = isMin ? std::min(extreme, xyz[i]) : std::max(extreme, xyz[i]);
            json.Double(static_cast<double>(extreme));
        }
        json.EndArray();
    }
}

void writeView(JsonWriter& json, std::size_t offset, std::size_t length, unsigned target) {
    json.StartObject();
    writeCount(json, "buffer", 0);
    writeCount(json, "byteOffset", offset);
    writeCount(json, "byteLength", length);
    writeCount(json, "target", target);
    json.EndObject();
}

void writeAccessors(JsonWriter& json, std::span<const float> xyz, std::size_t indexCount) {
    constexpr unsigned singleType = 5126;
    constexpr unsigned unsignedType = 5125;
    json.Key("accessors");
    json.StartArray();
    json.StartObject();
    writeCount(json, "bufferView", 0);
    writeCount(json, "componentType", singleType);
    writeCount(json, "count", xyz.size() / 3);
    writeText(json, "type", "VEC3");
    writeBox(json, xyz);
    json.EndObject();
    json.StartObject();
    writeCount(json, "bufferView", 1);
    writeCount(json, "componentType", unsignedType);
    writeCount(json, "count", indexCount);
    writeText(json, "type", "SCALAR");
    json.EndObject();
    json.EndArray();
}

void writeBuffers(JsonWriter& json, std::size_t positionBytes, std::size_t indexBytes, const std::string& uri) {
    constexpr unsigned vertexBuffer = 34962;
    constexpr unsigned indexBuffer = 34963;
    json.Key("bufferViews");
    json.StartArray();
    writeView(json, 0, positionBytes, vertexBuffer);
    writeView(json, positionBytes, indexBytes, indexBuffer);
    json.EndArray();
    json.Key("buffers");
    json.StartArray();
    json.StartObject();
    writeCount(json, "byteLength", positionBytes + indexBytes);
    if (!uri.empty())
        writeText(json, "uri", uri);
    json.EndObject();
    json.EndArray();
}

std::string documentOf(std::span<const float> xyz, std::size_t indexCount, const std::string& uri) {
    rapidjson::StringBuffer buffer;
    JsonWriter json(buffer);
    json.StartObject();
    json.Key("asset");
    json.StartObject();
    writeText(json, "version", "2.0");
    writeText(json, "generator", "quarn " QUARN_VERSION);
    json.EndObject();
    constexpr std::string_view structure = R"([{"primitives": [{"attributes": {"POSITION": 0}, "indices": 1}]}])";
    constexpr std::pair<const char*, std::string_view> constants[] = {
        {"scene", "0"}, {"scenes", R"([{"nodes": [0]}])"}, {"nodes", R"([{"mesh": 0}])"}, {"meshes", structure}};
    for (const auto& [key, value] : constants) {
        json.Key(key);
        json.RawValue(value.data(), value.size(), rapidjson::kArrayType);
    }
    writeAccessors(json, xyz, indexCount);
    writeBuffers(json, xyz.size_bytes(), indexCount * sizeof(std::uint32_t), uri);
    json.EndObject();
    return buffer.GetString();
}

void putNumber(std::ostream& out, std::size_t number) {
    const auto value = static_cast<std::uint32_t>(number);
    out.write(reinterpret_cast<const char*>(&value), sizeof value);
}

} // namespace

void writeGltf(std::ostream& out, std::span<const float> xyz, const MeshPolygons& polygons, bool binary) {
    const std::vector<std::uint32_t> triangles = trianglesOf(polygons);
    if (xyz.empty() || triangles.empty())
        throw std::runtime_error("glTF has no meshes without vertices or triangles: write .obj");
    const std::size_t length = xyz.size_bytes() + triangles.size() * sizeof(triangles[0]);
    if (length > std::numeric_limits<std::uint32_t>::max() / 2)
        throw std::runtime_error("its " + std::to_string(length) + " bytes of numbers are too many: write .obj");
    std::string numbers;
    numbers.reserve(length);
    numbers.append(bytesOf(xyz)).append(bytesOf(triangles));
    if (!binary) {
        out << documentOf(xyz, triangles.size(), "data:application/octet-stream;base64," + storage::base64(numbers))
            << '\n';
        return;
    }
    std::string json = documentOf(xyz, triangles.size(), "");
    json.resize((json.size() + 3) / 4 * 4, ' ');
    out << "glTF";
    putNumber(out, 2);
    putNumber(out, 12 + 8 + json.size() + 8 + numbers.size());
    putNumber(out, json.size());
    out << "JSON" << json;
    putNumber(out, numbers.size());
    out.write("BIN\0", 4) << numbers;
}

} // namespace quarn
