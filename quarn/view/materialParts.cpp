// SPDX-License-Identifier: Apache-2.0
// Source: the glTF 2.0 specification of the Khronos Group: 3.7 "Geometry".
#include "quarn/view/materialParts.h"

#include "quarn/character/gltfTypes.h"
#include "quarn/character/gltfValues.h"
#include "quarn/scene/plugs.h"

#include <algorithm>
#include <array>
#include <cstring>
#include <stdexcept>

namespace quarn {
namespace {

constexpr std::uint64_t firstPolygonMode = 4; // triangles, then strips and fans; points and lines are before

std::uint64_t modeOf(const JsonValue& primitive) {
    return sizeOf(primitive, "mode", firstPolygonMode, "a part of a mesh");
}

std::optional<std::size_t> materialOf(const JsonValue& document, const JsonValue& primitive) {
    return indexOf(member(primitive, "material"), listOf(document, "materials").Size(), "materials",
                   "a part of a mesh");
}

std::optional<std::size_t> accessorOf(const JsonValue& document, const JsonValue& object, const char* name) {
    return indexOf(member(object, name), listOf(document, "accessors").Size(), "accessors", "a part of a mesh");
}

std::size_t countOf(const JsonValue& document, std::size_t accessor) {
    return sizeOf(listOf(document, "accessors")[static_cast<rapidjson::SizeType>(accessor)], "count", 0,
                  element("accessors", accessor));
}

std::size_t vertexCountOf(const JsonValue& document, const JsonValue& primitive) {
    const JsonValue* attributes = member(primitive, "attributes");
    const auto positions = attributes == nullptr ? std::nullopt : accessorOf(document, *attributes, "POSITION");
    return positions ? countOf(document, *positions) : 0;
}

std::size_t vertexCountOfMesh(const JsonValue& document, const JsonValue& mesh) {
    std::size_t count = 0;
    for (const JsonValue& primitive : listOf(mesh, "primitives").GetArray())
        count += vertexCountOf(document, primitive);
    return count;
}

// the corners of a part, as the file counts its vertices; without an accessor one after the other
std::vector<std::uint32_t> cornersOf(const JsonValue& document, const JsonValue& primitive, GltfBytes& bytes) {
    std::vector<std::uint32_t> corners;
    const auto accessor = accessorOf(document, primitive, "indices");
    if (!accessor) {
        corners.resize(vertexCountOf(document, primitive));
        for (std::size_t i = 0; i < corners.size(); ++i)
            corners[i] = static_cast<std::uint32_t>(i);
        return corners;
    }
    const std::string values = packedValues(document, *accessor, bytes);
    corners.resize(countOf(document, *accessor));
    const std::size_t size = corners.empty() ? 0 : values.size() / corners.size(); // little-endian, 1, 2 or 4 bytes
    for (std::size_t i = 0; i < corners.size(); ++i)
        std::memcpy(&corners[i], &values[i * size], std::min(size, sizeof corners[i]));
    return corners;
}

/// Compares the parts of a mesh of the file with the polygons of the scene, one after the other.
class PolygonMatch {
public:
    PolygonMatch(const JsonValue& document, GltfBytes& bytes, const WantedMesh& wanted)
        : document_(document)
        , bytes_(bytes)
        , wanted_(wanted) {}

    /// Nothing when they are others.
    std::optional<std::vector<MaterialPart>> of(const JsonValue& mesh) {
        std::vector<MaterialPart> parts;
        for (const JsonValue& primitive : listOf(mesh, "primitives").GetArray()) {
            const std::size_t before = polygon_;
            const std::uint64_t mode = modeOf(primitive);
            if (mode > firstPolygonMode || extensionOf(primitive, dracoExtension) != nullptr ||
                (mode == firstPolygonMode && !take(primitive)))
                return std::nullopt;
            firstVertex_ += vertexCountOf(document_, primitive);
            parts.push_back({materialOf(document_, primitive), polygon_ - before});
        }
        if (polygon_ != wanted_.polygons.sizes.size())
            return std::nullopt;
        return parts;
    }

private:
    bool take(const JsonValue& primitive) {
        const std::vector<std::uint32_t> corners = cornersOf(document_, primitive, bytes_);
        for (std::size_t corner = 0; corner + 3 <= corners.size(); corner += 3) {
            std::array<std::uint32_t, 3> triangle{};
            for (std::size_t i = 0; i < triangle.size(); ++i) {
                const std::size_t vertex = firstVertex_ + corners[corner + i];
                if (vertex >= wanted_.sceneVertex.size())
                    return false;
                triangle[i] = static_cast<std::uint32_t>(wanted_.sceneVertex[vertex]);
            }
            // what joining vertices has made a line or a point is no polygon of the scene
            if (triangle[0] == triangle[1] || triangle[1] == triangle[2] || triangle[2] == triangle[0])
                continue;
            if (!isNext(triangle))
                return false;
        }
        return true;
    }

    bool isNext(const std::array<std::uint32_t, 3>& triangle) {
        const MeshPolygons& polygons = wanted_.polygons;
        const std::size_t first = 3 * polygon_;
        if (polygon_ >= polygons.sizes.size() || polygons.sizes[polygon_] != 3 || first + 3 > polygons.corners.size())
            return false;
        ++polygon_;
        return std::equal(triangle.begin(), triangle.end(),
                          polygons.corners.begin() + static_cast<std::ptrdiff_t>(first));
    }

    const JsonValue& document_;
    GltfBytes& bytes_;
    const WantedMesh& wanted_;
    std::size_t polygon_ = 0, firstVertex_ = 0;
};

// the material of all polygons; nothing where they have several
std::optional<MaterialPart> onlyPart(const JsonValue& document, const JsonValue& mesh, const WantedMesh& wanted) {
    std::optional<MaterialPart> only;
    for (const JsonValue& primitive : listOf(mesh, "primitives").GetArray()) {
        if (modeOf(primitive) < firstPolygonMode)
            continue;
        const auto material = materialOf(document, primitive);
        if (only && only->material != material)
            return std::nullopt;
        only = MaterialPart{material, wanted.polygons.sizes.size()};
    }
    return only;
}

// whether a node of the file that shows the mesh has the name of the scene's
bool isNamed(const JsonValue& document, std::size_t mesh, const std::string& name) {
    const JsonValue& nodes = listOf(document, "nodes");
    return std::any_of(nodes.Begin(), nodes.End(), [&](const JsonValue& node) {
        const JsonValue* shown = member(node, "mesh");
        return shown != nullptr && shown->IsUint64() && shown->GetUint64() == mesh &&
               usableName(textOf(node, "name")) == name;
    });
}

} // namespace

std::vector<MaterialPart> materialParts(const JsonValue& document, GltfBytes& bytes, const WantedMesh& wanted) {
    std::vector<std::size_t> alike; // in their number of vertices
    std::vector<std::pair<std::size_t, std::vector<MaterialPart>>> same;
    const JsonValue& meshes = listOf(document, "meshes");
    for (rapidjson::SizeType mesh = 0; mesh < meshes.Size(); ++mesh) {
        if (vertexCountOfMesh(document, meshes[mesh]) != wanted.sceneVertex.size())
            continue;
        alike.push_back(mesh);
        if (auto parts = PolygonMatch(document, bytes, wanted).of(meshes[mesh]))
            same.emplace_back(mesh, std::move(*parts));
    }
    for (const auto& [mesh, parts] : same)
        if (same.size() == 1 || isNamed(document, mesh, wanted.name))
            return parts;
    if (same.size() > 1)
        throw std::runtime_error("several of its meshes have the polygons of " + wanted.name);
    if (alike.size() != 1)
        throw std::runtime_error("none of its meshes has the polygons of " + wanted.name);
    const auto only = onlyPart(document, meshes[static_cast<rapidjson::SizeType>(alike.front())], wanted);
    if (!only)
        throw std::runtime_error("which polygons of " + wanted.name +
                                 " have which material cannot be told: they were changed, or are compressed");
    return {*only};
}

} // namespace quarn
