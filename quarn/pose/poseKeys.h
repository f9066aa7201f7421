// SPDX-License-Identifier: Apache-2.0
// Keys that quarn puts on plugs: animation curves of their own, so that they can be told from the scene's animation.
#pragma once

#include "openquarn/HPlug.h"

#include <vector>

namespace quarn {

struct PoseKeys {
    enum class Kind : int { step = 0, linear = 1, spline = 2 }; // the numbers of animCurve.interpolation
    std::vector<double> times;                                  ///< in frames, ascending; not empty
    std::vector<double> values;                                 ///< one for each time
    std::vector<double> slopes;                                 ///< for spline: in and out of each key, per frame
    Kind kind = Kind::step;
    std::size_t drawn = 0; ///< the first so many were drawn, each for itself
    bool isMotion = false; ///< somebody's motion, which poses can be taken from; else sampled poses
};

/// All throw std::runtime_error, naming the plug. Thread: main.

/// Takes whatever drives the plug away: what is connected into it, or into a plug that it is a part of. The other parts
/// of that one keep their value, but those of translate, rotate and scale of a joint go to the pose of its restMatrix,
/// or, when that is the identity, to the defaults of the attributes. Then puts the keys on, driven by the scene's time.
/// Keys that putPoseKeys() put on before are gone.
void putPoseKeys(const HPlug& plug, const PoseKeys& keys);

/// The same without keys: the plug has that value, at any time.
void holdAt(const HPlug& plug, double value);

/// Deletes all keys that putPoseKeys() put on and their curves; the plugs get the value of their first key.
void removePoseKeys();

/// Whether the node is a curve of putPoseKeys(): an animCurve of the name NODE_ATTRIBUTE_pose, or of
/// NODE_ATTRIBUTE_keys for a motion, that drives that plug and nothing else.
bool isPoseCurve(const HObject& node);
/// The same for sampled poses alone.
bool isSampledCurve(const HObject& node);

/// Curves that drive something, but for those of sampled poses: the scene's own, and motions of putPoseKeys().
std::vector<HObject> animationCurves();
/// All curves that drive something.
std::vector<HObject> drivingCurves();

} // namespace quarn
