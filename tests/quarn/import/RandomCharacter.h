// SPDX-License-Identifier: Apache-2.0
// Characters of chance, and where their vertices are by the plain formula.
#pragma once

#include "quarn/character/Character.h"

#include <random>

namespace quarn {

struct CharacterKind {
    int joints = 6;
    bool evenScale = false; ///< one scale for all axes, above 0
    bool boundAtRest = true;
    bool flat = false; ///< all joints are roots
};

/// Two skinned meshes, one of them in a space of its own, with up to 6 influences a vertex and one vertex without, and
/// an animation of 1 second that moves most joints in all ways.
Character randomCharacter(unsigned seed, const CharacterKind& kind);

/// The world's transformations of the joints at a time of the first animation; at rest without one (seconds below 0).
std::vector<HMatrix> plainWorlds(const Character& character, double seconds);

/// Of a vertex with influences, by the formula of Character.h with weights that are brought to a sum of 1.
HPoint plainPoint(const CharacterMesh& mesh, const std::vector<HMatrix>& worlds, std::size_t vertex);

} // namespace quarn
