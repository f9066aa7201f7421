// SPDX-License-Identifier: Apache-2.0
// What a scene does over a range of frames: the values of all that moves, read once, for files of poses.
#pragma once

#include "openquarn/HQuaternion.h"
#include "openquarn/HVector.h"
#include "quarn/console/Console.h"
#include "quarn/scene/PoseControls.h"
#include "quarn/scene/frames.h"
#include "quarn/scene/joints.h"

#include <array>
#include <optional>

namespace quarn {

/// A plug over the frames.
struct PlugTrack {
    HPlug plug;
    std::string name;           ///< as users write it
    std::vector<double> values; ///< one a frame, in the unit of the plug
    bool isKeyable = false;     ///< quarn pose --keys can take it
};

struct Motion {
    FrameRange frames;
    std::vector<SceneJoint> joints;
    /// Of every joint whose `translate`, `rotate`, `jointOrient` or `scale` is driven, all three parts; whatever else
    /// an animation curve drives; and the controls that the deformer's poses are made of. Each once.
    std::vector<PlugTrack> tracks;

    /// The track of a plug of that name; null without one: the plug does not move.
    const PlugTrack* find(const std::string& name) const;
};

/// Evaluates the frames; the scene stays as it is. Throws std::runtime_error, naming plug and frame, when a plug cannot
/// be evaluated or gives no finite number, and when there are more than 100 000 000 numbers; Interrupted. Thread: main.
Motion readMotion(const std::optional<Warp>& warp, const FrameRange& frames, const Console& console);

/// A joint in one frame: its matrix is scale * rotation * translation.
struct JointPose {
    HVector scale{1.0, 1.0, 1.0};
    HQuaternion rotation; ///< of length 1
    HVector translation;
};

/// A joint in all frames. Each rotation is the one of its two quaternions that is nearer to the one before.
std::vector<JointPose> posesOf(const Motion& motion, const SceneJoint& joint);

/// A joint at rest: its restMatrix; where that is the identity, as nobody has set it, the first of its poses.
JointPose restOf(const SceneJoint& joint, const std::vector<JointPose>& poses);

} // namespace quarn
