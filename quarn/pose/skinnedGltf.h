// SPDX-License-Identifier: Apache-2.0
// The meshes of a scene with their skins, as glTF has them.
#pragma once

#include "quarn/scene/GltfNumbers.h"
#include "quarn/scene/shapes.h"
#include "quarn/scene/skins.h"

#include <optional>

namespace quarn {

/// A mesh with its skin and its morph targets, by the accessors of their numbers.
struct SkinnedGltf {
    /// Added to the positions by a weight, before the skin.
    struct Target {
        std::string name;
        std::size_t positions = 0;
        double restWeight = 0.0;
    };
    std::string name;
    std::size_t positions = 0;
    std::optional<std::size_t> uvs;                                    ///< none: the mesh has none
    std::size_t indices = 0;                                           ///< of triangles
    std::vector<std::pair<std::size_t, std::size_t>> jointsAndWeights; ///< sets of four influences a vertex
    std::optional<std::size_t> inverseBinds;                           ///< of all joints of the scene; none: no skin
    std::vector<Target> targets;
    std::size_t weightKeys = 0; ///< of all targets, frame by frame, where there are any
};

/// Whether glTF can hold it: empty, or why not, as in "is moved by a_matrix, which is no joint".
std::string whyNotInGltf(const SceneSkin& skin);

/// Adds the numbers of a skin that glTF can hold; every joint of the scene is one of the skin's, by its index.
/// `restWorlds` [joints] where they are at rest: those that move nothing are bound there. Polygons become fans of
/// triangles, weights are brought to a sum of 1, vertices are split where texture coordinates have a seam. `shapes`, or
/// null, move the mesh before the skin. Throws std::runtime_error. Thread: main.
SkinnedGltf addSkinned(const SceneSkin& skin, const SceneShapes* shapes, const std::vector<HMatrix>& restWorlds,
                       GltfNumbers& numbers);

/// The same of a mesh without skin.
SkinnedGltf addMorphed(const SceneShapes& shapes, GltfNumbers& numbers);

} // namespace quarn
