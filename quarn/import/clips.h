// SPDX-License-Identifier: Apache-2.0
// Several animations of a character as one.
#pragma once

#include "quarn/character/Character.h"

#include <string>
#include <vector>

namespace quarn {

/// Where an animation of the file lies in the scene.
struct ClipRange {
    std::string name;
    int firstFrame = 1;
    int lastFrame = 1; ///< that still shows something of it
};

struct Clips {
    Animation animation; ///< all of them, one after another
    std::vector<ClipRange> ranges;
};

/// Lays animations one after another, the first at second 0, each from a whole frame on. Between two lies one frame in
/// which the last pose of the first is held; from then to the next frame everything goes to where the second begins.
/// What an animation does not move is at rest in it. One animation alone stays as it is. `animations` are of the
/// character, and not empty; `framesPerSecond` is above 0. Throws std::runtime_error, naming the animation, when the
/// frames come to more than 100000.
Clips layClips(const Character& character, const std::vector<const Animation*>& animations, double framesPerSecond);

/// [{"name": "wave", "first": 1, "last": 25}, ...]
std::string clipsText(const std::vector<ClipRange>& ranges);

} // namespace quarn
