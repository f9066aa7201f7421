// SPDX-License-Identifier: Apache-2.0
// The morph targets of a mesh as nodes of the scene.
#pragma once

#include "quarn/character/Character.h"

#include "openquarn/HMatrix.h"
#include "openquarn/HObject.h"

namespace quarn {

struct MorphNodes {
    HObject shapes;  ///< a blendShape; null for a mesh without targets
    HObject sliders; ///< its weights: element i of `slider` is that of target i
};

/// Makes both for a mesh that is the node `node`, whose points are those of the character's by `toScene`: the deltas go
/// the same way, without its translation. The weights are those at rest. Throws std::runtime_error, naming the node.
/// Thread: main.
MorphNodes makeMorphs(const CharacterMesh& mesh, const HObject& node, const HMatrix& toScene);

} // namespace quarn
