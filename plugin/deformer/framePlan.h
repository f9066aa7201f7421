// SPDX-License-Identifier: Apache-2.0
// What an evaluation does, as two decisions: what it attempts, and what it then applies.
#pragma once

namespace neuralWarp {

enum class Attempt {
    nothing,      ///< the geometry stays as it came
    withoutModel, ///< every vertex is blended, from its own position
    withModel,    ///< the model is loaded, when that is due, and applied, when it can be
};

/// `isActive`    the model is on, and nothing has kept it from being loaded so far.
/// `isMorphed`   a target morph is in force.
/// `morphWeight` how much of the way to the target it takes the vertices: at exactly 1, nothing of the model would be
///               left to see.
constexpr Attempt whatToAttempt(bool isActive, bool isMorphed, double morphWeight) {
    if (isActive && !(isMorphed && morphWeight == 1.0))
        return Attempt::withModel;
    return isMorphed ? Attempt::withoutModel : Attempt::nothing;
}

/// Whether the model is applied. `canApplyModel` and `drivesNothing` are those of the state, after the attempt's loads.
constexpr bool isModelApplied(Attempt attempt, bool canApplyModel, bool drivesNothing) {
    return attempt == Attempt::withModel && canApplyModel && !drivesNothing;
}

} // namespace neuralWarp
