// SPDX-License-Identifier: Apache-2.0
// A motion in as few morph targets as an error allows.
#pragma once

#include "quarn/play/MorphClip.h"

#include <vector>

namespace quarn {

struct FittedClip {
    MorphClip clip;
    double error; ///< largest distance of a vertex from where a frame has it, in the unit of the points
};

/// The fewest principal shapes of the motion whose `error` is at most `allowed`, above 0; their normals are those that
/// fit best. The base and the shapes are such that each weight goes from 0 to 1. `frames` at least 2, of as many
/// vertices each. With all shapes and a larger error, where single precision is too coarse.
FittedClip fitClip(const std::vector<ClipShape>& frames, double allowed);

} // namespace quarn
