// SPDX-License-Identifier: Apache-2.0
// The animations of a character out of the importer's.
#pragma once

#include "quarn/character/skinnedMeshes.h"

namespace quarn {

/// Adds the animations, and warnings, to the character. Throws std::runtime_error, naming the animation, when a key is
/// not finite or keys are not in the order of their times.
void readAnimations(const aiScene& scene, const Skeleton& skeleton, const MeshIndices& meshes, const SourceHints& hints,
                    Character& character);

} // namespace quarn
