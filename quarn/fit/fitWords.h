// SPDX-License-Identifier: Apache-2.0
// What a user is told of a comparison.
#pragma once

#include "quarn/fit/targetFit.h"

#include <optional>
#include <string>

namespace quarn {

/// How the frames came to be where they were compared, and who asks.
struct FitContext {
    std::string what = "the target"; ///< the subject of the sentences: "target.npy", "the target of strip"
    double metersPerUnit = 1.0;
    std::optional<double> startFrame; ///< of the cache's first frame, where a flag can say another
    AxisTurn axes;                    ///< what the axes have been turned by, and the scale, on the way into the scene
    double scale = 1.0;
    bool canAlign = false; ///< the command that asks has --align; else `quarn target` is named, which has it
    /// It is another skin of the same joints, and is compared with the one that the scene computes: it may be as far
    /// from that as it likes where they bend, and is where the mesh is at rest.
    bool isSkin = false;
    std::string reference() const { return isSkin ? "quarn's own skin" : "the skin"; }
};

/// "0.4 mm from the skin in the mean (0.15 % of the mesh), 26 mm at most, in 12 frames".
std::string distanceText(const FitDistance& distance, double diagonal, const FitContext& context);

/// What is the matter, as the end of "it looks as if ": "its numbers were 100 times too large (centimetres against
/// metres)". Empty without a cause.
std::string causeText(const TargetFit& fit, const FitContext& context);

/// The flags of `quarn target` that mend it; empty where a cause has none.
std::string flagText(const TargetFit& fit, const FitContext& context);

/// Sentences, each empty where there is nothing to say. `isMended` says that fit.change has been made: distances are
/// then those with it, and no cause is left.
struct FitVerdict {
    std::string refusal; ///< nothing that a model should be trained with
    std::string warning; ///< it could be one, but something is the matter
    std::string note;    ///< what the frames do not tell
};
FitVerdict verdictOf(const TargetFit& fit, const FitContext& context, bool isMended);

} // namespace quarn
