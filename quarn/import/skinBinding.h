// SPDX-License-Identifier: Apache-2.0
// How a mesh of a character is bound in a scene, where meshes are in the space of the world.
#pragma once

#include "quarn/character/Character.h"

#include <vector>

namespace quarn {

/// Where joints are at rest, to the world, by joint.
struct RestWorlds {
    std::vector<HMatrix> file;
    std::vector<HMatrix> scene; ///< without what a joint of the scene cannot hold
};

struct SkinBinding {
    HMatrix toScene;             ///< from the mesh's space in the file to that of the scene
    std::vector<Binding> joints; ///< inverse bind matrices from the space of the scene; empty: nothing moves the mesh
    std::vector<double> counts;  ///< by vertex, of its influences; the lists of a skinCluster, as the next two
    std::vector<double> influences; ///< positions in `joints`
    std::vector<double> weights;
    int movedAtRest = -1; ///< a joint that moves the mesh already at rest; -1 when none does
};

/// A skin keeps its weights. A mesh without skin that hangs below a joint follows that joint alone. At rest the joints
/// move the mesh exactly as in the file, also where those of the scene are a little off.
SkinBinding bindMesh(const CharacterMesh& mesh, const RestWorlds& worlds);

} // namespace quarn
