// SPDX-License-Identifier: Apache-2.0
// The steps of a run, in their order.
#pragma once

#include "quarn/run/RunFacts.h"
#include "quarn/run/Step.h"

namespace quarn {

/// The steps that can be told from what is known: with more facts there are more at the end, and those before stay as
/// they are. `settings` resolved and checked. Steps of several meshes stand together, mesh by mesh. Throws
/// std::runtime_error with the sentence for the user for settings that do not go with the facts, such as targets of
/// a mesh that there is none of.
Plan planOf(const RunSettings& settings, const RunFacts& facts);

/// Names that steps have, in their order: what --until takes.
const Words& stepNames();

/// Nodes of meshes that have a skin and are to have a model, and of those that are left out, having no targets.
struct MeshChoice {
    Words chosen, leftOut;
};
MeshChoice chooseMeshes(const RunSettings& settings, const CharacterFacts& character);

/// The frames that nobody trains, at the end of the poses. Throws std::runtime_error when too few others are left.
FrameSpan heldOutFrames(const RunSettings& settings, const FrameSpan& poses);

/// In the run's folder, where no other limits are given: those that the import has taken, to be edited.
constexpr const char* limitsFile = "limits.json";

/// Texts of names of files and frames, as the steps have them.
std::string framesText(const FrameSpan& span);
std::filesystem::path skinFile(const std::string& scene, const std::string& mesh);

} // namespace quarn
