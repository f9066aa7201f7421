// SPDX-License-Identifier: Apache-2.0
// Source: the glTF 2.0 specification of the Khronos Group: the JSON object.
#include "quarn/play/meshFiles.h"
#include "quarn/scene/GltfNumbers.h"
#include "quarn/scene/GltfVertices.h"
#include "quarn/scene/gltfParts.h"
#include "storage/encodings.h"

#include <array>
#include <optional>
#include <ostream>
#include <stdexcept>

namespace quarn {
namespace {

using Shape = GltfNumbers::Shape;
using Use = GltfNumbers::Use;

class GltfMesh {
public:
    GltfMesh(std::span<const float> xyz, const MeshPolygons& polygons) {
        const GltfVertices vertices(polygons);
        if (xyz.empty() || vertices.triangles.empty())
            throw std::runtime_error("glTF has no meshes without vertices or triangles: write .obj");
        positions_ = numbers_.add(vertices.withCopies<float>(xyz, 3), {Shape::vec3, Use::vertices, true});
        indices_ = numbers_.add(vertices.triangles, {Shape::scalar, Use::indices});
        if (!vertices.uvs.empty())
            uvs_ = numbers_.add(vertices.uvs, {Shape::vec2, Use::vertices});
    }

    std::string_view numbers() const { return numbers_.bytes(); }
    std::string document(const std::string& uri) const {
        rapidjson::StringBuffer buffer;
        JsonWriter json(buffer);
        json.StartObject();
        writeGltfAsset(json);
        writeCount(json, "scene", 0);
        raw(json, "scenes", R"([{"nodes": [0]}])");
        raw(json, "nodes", R"([{"mesh": 0}])");
        const std::string uvs = uvs_ ? ", \"TEXCOORD_0\": " + std::to_string(*uvs_) : "";
        raw(json, "meshes",
            R"([{"primitives": [{"attributes": {"POSITION": )" + std::to_string(positions_) + uvs +
                "}, \"indices\": " + std::to_string(indices_) + "}]}]");
        numbers_.write(json, uri);
        json.EndObject();
        return buffer.GetString();
    }

private:
    static void raw(JsonWriter& json, const char* key, const std::string& value) {
        json.Key(key);
        json.RawValue(value.data(), value.size(), rapidjson::kArrayType);
    }

    GltfNumbers numbers_;
    std::size_t positions_ = 0, indices_ = 0;
    std::optional<std::size_t> uvs_;
};

} // namespace

void writeGltf(std::ostream& out, std::span<const float> xyz, const MeshPolygons& polygons, bool binary) {
    const GltfMesh mesh(xyz, polygons);
    if (binary)
        return writeGlb(out, mesh.document(""), std::array{mesh.numbers()});
    out << mesh.document("data:application/octet-stream;base64," + storage::base64(mesh.numbers())) << '\n';
}

} // namespace quarn
