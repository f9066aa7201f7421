// SPDX-License-Identifier: Apache-2.0
// A character at a time of an animation.
#pragma once

#include "quarn/character/Character.h"

#include <vector>

namespace quarn {

/// Evaluates an animation. `character` and `animation` must outlive it. Thread: any.
class AnimatedPose {
public:
    AnimatedPose(const Character& character, const Animation& animation);

    /// The local transformation of a joint: its tracks, and for a track without keys what it is at rest.
    HMatrix local(std::size_t joint, double seconds) const;
    /// Of all joints, to the world.
    std::vector<HMatrix> worlds(double seconds) const;

private:
    const Character& character_;
    std::vector<const JointChannel*> channels_; ///< by joint; null where the animation does not move it
    std::vector<HVector> restScales_;           ///< by joint, where a channel needs it
    std::vector<HQuaternion> restRotations_;
};

/// What a track has at a time. Not for a track without keys.
HVector valueAt(const Track<HVector>& track, double seconds);
HQuaternion valueAt(const Track<HQuaternion>& track, double seconds);

/// When an animation has a key, and every frame of it: rising, each once. `framesPerSecond` above 0.
/// Throws std::runtime_error, naming the animation, when it is longer than 100000 frames.
std::vector<double> sampleTimes(const Animation& animation, double framesPerSecond);

} // namespace quarn
