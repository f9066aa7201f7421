// SPDX-License-Identifier: Apache-2.0
// The morph targets of a mesh out of what the file says.
#pragma once

#include "quarn/character/SourceHints.h"

#include <cstdint>
#include <string>
#include <vector>

namespace quarn {

/// Adds the targets that are shown at a node to its mesh, whose points are those of the file, `partSizes` of them in
/// each part; a warning instead where the importer has made other vertices. Throws std::runtime_error, naming mesh and
/// target, when a delta or a weight is not finite.
void addMorphTargets(const SourceHints& hints, const std::string& node, const std::vector<std::uint32_t>& partSizes,
                     CharacterMesh& mesh, std::vector<std::string>& warnings);

/// The channels of an animation, by its index in the file, for the targets of the mesh that a node shows. Throws
/// std::runtime_error, naming `owner`, when a key is not finite or keys are not in the order of their times.
std::vector<MorphChannel> morphChannels(const SourceMorphTrack& track, std::uint32_t mesh, std::size_t targets,
                                        const std::string& owner);

} // namespace quarn
