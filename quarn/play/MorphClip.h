// SPDX-License-Identifier: Apache-2.0
// A motion as a mesh at rest and morph targets, which weights add to it.
#pragma once

#include <string>
#include <vector>

namespace quarn {

/// Of a mesh in one frame, or of a target: how far it moves them.
struct ClipShape {
    std::vector<float> points;  ///< [vertices][3]
    std::vector<float> normals; ///< [vertices][3]; length 1 in a frame
};

struct ClipTarget {
    std::string name;
    ClipShape shape;
};

/// Frame f is base + sum of weights[f][t] * targets[t], points and normals alike.
struct MorphClip {
    ClipShape base;
    std::vector<ClipTarget> targets;
    std::vector<float> weights; ///< [frames][targets], 0 to 1
};

/// The first frame as the base and one target for each other one: exact but for the rounding of single precision.
/// `frames` at least 2, of as many vertices each; `numbers` what they are called, as many.
MorphClip clipOfFrames(std::vector<ClipShape> frames, const std::vector<int>& numbers);

} // namespace quarn
