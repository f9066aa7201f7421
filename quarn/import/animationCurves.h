// SPDX-License-Identifier: Apache-2.0
// The animation of a character as curves of the scene.
#pragma once

#include "quarn/import/characterScene.h"

namespace quarn {

/// The frame of a time of the file.
constexpr double frameOf(double seconds, double framesPerSecond) {
    return 1.0 + seconds * framesPerSecond;
}

/// The last frame that still shows something of an animation of that length.
int lastFrameOf(double seconds, double framesPerSecond);

/// A rotation of the file is R * JO in the scene: this R.
HQuaternion rotateOf(const HQuaternion& rotation, const JointRest& rest);

/// Makes a curve for every track that leaves the rest pose, and connects it into its joint or slider. `rests` are those
/// that the joints were made of. Returns how many curves there are. Throws std::runtime_error, naming the node. Thread:
/// main.
std::size_t addAnimation(const Character& character, const Animation& animation, const std::vector<JointRest>& rests,
                         double framesPerSecond, const CharacterScene& scene);

} // namespace quarn
