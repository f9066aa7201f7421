// SPDX-License-Identifier: Apache-2.0
// The glTF file that a mesh of the scene was imported from, and what of it is what in the scene.
#pragma once

#include "openquarn/HObject.h"
#include "openquarn/HPlug.h"
#include "quarn/character/sourceGltf.h"
#include "quarn/play/GltfMesh.h"
#include "quarn/play/GltfNodes.h"

#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <vector>

namespace quarn {

struct ClipSource {
    /// A joint of the scene that is a node of the file.
    struct JointNode {
        std::size_t node = 0;
        HPlug world; ///< a matrix
    };
    /// The weights of the morph targets that the file shows at a node, in the scene; empty where it has none.
    struct MorphNode {
        std::size_t node = 0;
        std::vector<HPlug> weights;
    };
    std::string path;
    SourceGltf file;
    std::optional<GltfNodes> nodes;          ///< of the file as it was; always there
    std::optional<GltfMesh> mesh;            ///< the one that is played; the same
    std::size_t meshNode = 0;                ///< the node that shows the mesh
    std::vector<std::int32_t> sceneVertexOf; ///< by vertex of the file, part by part; below the scene's count
    std::vector<JointNode> joints;           ///< parents before their children
    std::vector<MorphNode> morphs;           ///< of all meshes
};

/// The file that the scene's character comes from; empty where the scene knows none. Thread: main.
std::string sourceFile();
inline bool hasSourceFile() {
    return !sourceFile().empty();
}

/// The file of the scene's character, for a mesh node of `vertexCount` vertices. Throws std::runtime_error with the
/// reason why there is none that could be written again with a motion: it is no glTF file, is not there, has changed,
/// or its vertices are not known. Thread: main.
std::shared_ptr<ClipSource> findClipSource(const HObject& mesh, std::size_t vertexCount);

} // namespace quarn
