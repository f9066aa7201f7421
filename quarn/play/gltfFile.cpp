// SPDX-License-Identifier: Apache-2.0
// Source: the glTF 2.0 specification of the Khronos Group: the JSON object.
#include "quarn/play/meshFiles.h"
#include "quarn/scene/gltfParts.h"
#include "storage/encodings.h"

#include <array>
#include <limits>
#include <ostream>
#include <stdexcept>
#include <string_view>

namespace quarn {
namespace {

void writeView(JsonWriter& json, std::size_t offset, std::size_t length, unsigned target) {
    json.StartObject();
    writeCount(json, "buffer", 0);
    writeCount(json, "byteOffset", offset);
    writeCount(json, "byteLength", length);
    writeCount(json, "target", target);
    json.EndObject();
}

void writeAccessors(JsonWriter& json, std::span<const float> xyz, std::size_t indexCount) {
    json.Key("accessors");
    json.StartArray();
    json.StartObject();
    writeCount(json, "bufferView", 0);
    writeCount(json, "componentType", gltfFloat);
    writeCount(json, "count", xyz.size() / 3);
    writeText(json, "type", "VEC3");
    writeGltfBox(json, xyz, 3);
    json.EndObject();
    json.StartObject();
    writeCount(json, "bufferView", 1);
    writeCount(json, "componentType", gltfUnsigned);
    writeCount(json, "count", indexCount);
    writeText(json, "type", "SCALAR");
    json.EndObject();
    json.EndArray();
}

void writeBuffers(JsonWriter& json, std::size_t positionBytes, std::size_t indexBytes, const std::string& uri) {
    json.Key("bufferViews");
    json.StartArray();
    writeView(json, 0, positionBytes, gltfVertexBuffer);
    writeView(json, positionBytes, indexBytes, gltfIndexBuffer);
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
    writeGltfAsset(json);
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

} // namespace

void writeGltf(std::ostream& out, std::span<const float> xyz, const MeshPolygons& polygons, bool binary) {
    const std::vector<std::uint32_t> triangles = gltfTriangles(polygons);
    if (xyz.empty() || triangles.empty())
        throw std::runtime_error("glTF has no meshes without vertices or triangles: write .obj");
    const std::size_t length = xyz.size_bytes() + triangles.size() * sizeof(triangles[0]);
    if (length > std::numeric_limits<std::uint32_t>::max() / 2)
        throw std::runtime_error("its " + std::to_string(length) + " bytes of numbers are too many: write .obj");
    if (binary)
        return writeGlb(out, documentOf(xyz, triangles.size(), ""), std::array{bytesOf(xyz), bytesOf(triangles)});
    std::string numbers;
    numbers.reserve(length);
    numbers.append(bytesOf(xyz)).append(bytesOf(triangles));
    out << documentOf(xyz, triangles.size(), "data:application/octet-stream;base64," + storage::base64(numbers))
        << '\n';
}

} // namespace quarn
