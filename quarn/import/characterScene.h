// SPDX-License-Identifier: Apache-2.0
// The nodes of a scene that hold a character: docs/import.md says which there are.
#pragma once

#include "quarn/character/Character.h"
#include "quarn/import/morphShapes.h"
#include "quarn/import/restPose.h"

#include "openquarn/HObject.h"

#include <string>
#include <vector>

namespace quarn {

struct SceneMesh {
    HObject mesh;
    MorphNodes morphs; ///< between mesh and skin
    HObject skin;      ///< null for a mesh that no joint moves

    /// The last of the nodes that move it, whose outputGeom[0] it is in motion; null where nothing does.
    HObject mover() const { return skin.isNull() ? morphs.shapes : skin; }
};

struct CharacterScene {
    HObject character;
    std::vector<HObject> joints;    ///< by the index of the character's
    std::vector<SceneMesh> meshes;  ///< the same
    std::vector<std::string> notes; ///< what a user should know: sentences without a full stop
};

/// Makes the character node, joints and meshes with their skins in the open scene, at rest as the file has it. The
/// points of a mesh are brought to the space of the world, so that its skin does not move it at rest. `rests` by joint,
/// see splitRests(). Throws std::runtime_error, naming the node. Thread: main.
CharacterScene buildScene(const Character& character, const std::vector<JointRest>& rests);

} // namespace quarn
