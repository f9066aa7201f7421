// SPDX-License-Identifier: Apache-2.0
// Which polygons of a mesh have which material of the glTF file that it was imported from.
#pragma once

#include "quarn/character/GltfBytes.h"
#include "quarn/scene/meshes.h"

#include <cstddef>
#include <cstdint>
#include <optional>
#include <span>
#include <string>
#include <vector>

namespace quarn {

/// Polygons in a row.
struct MaterialPart {
    std::optional<std::size_t> material; ///< index into the file's
    std::size_t polygons = 0;
};

/// A mesh of the scene, as the file is searched for it.
struct WantedMesh {
    std::string name;                      ///< of its node in the scene
    std::vector<std::int32_t> sceneVertex; ///< of each vertex of the file, part by part
    const MeshPolygons& polygons;
};

/// All polygons of the mesh, in their order. The mesh of the file is the one whose triangles are the polygons, by that
/// map; where they cannot be compared (strips, compression) the only one of as many vertices, if all of it has one
/// material. `document` has passed checkGltf(). Throws std::runtime_error with the reason when there is none, or
/// several are alike.
std::vector<MaterialPart> materialParts(const JsonValue& document, GltfBytes& bytes, const WantedMesh& wanted);

} // namespace quarn
