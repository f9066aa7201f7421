// SPDX-License-Identifier: Apache-2.0
// Which kind of deltas a study speaks for, and the words for it.
#pragma once

#include "quarn/console/json.h"
#include "quarn/dataset/smoothingStudy.h"

#include <optional>
#include <string>

namespace quarn {

/// What was compared, and what came of it.
struct KindChoice {
    SmoothingStudy study;
    std::size_t chosen = 0; ///< index in study.kinds
};

/// What `--smoothing auto` compares: Offset deltas, and Surface deltas with 0 to 40 passes.
std::vector<DeltaKind> comparedKinds();

/// The index in study.kinds, which is not empty, of
///   the kinds whose jitter is at most one and a half times the least, and whose frames do not flip (turn by more than
///   90 degrees in a step, and by more than twice the least of all Surface kinds);
///   of these, the kinds whose mean error is at most a twentieth above the least;
///   of these the one with the fewest passes, the first of several.
/// Figures that are no numbers are worse than any.
std::size_t chosenKind(const SmoothingStudy& study);

/// A warning where the first kind of a study moves in jumps, which the second, Offset deltas, does not: its jitter is
/// more than twice that one's, and more than 1/2000 of the mesh's diagonal. Empty where it does not. `diagonal` in
/// units of the scene.
std::string jumpWarning(const SmoothingStudy& study, const std::string& mesh, double diagonal, double metersPerUnit);

/// A line that says what was chosen, and a table of what was compared, lengths in mm.
std::string choiceText(const KindChoice& choice, const std::string& mesh, double metersPerUnit);
/// "smoothing": an object that says the same, or null.
void writeChoice(JsonWriter& writer, const std::optional<KindChoice>& choice, double metersPerUnit);

} // namespace quarn
