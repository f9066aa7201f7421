// SPDX-License-Identifier: Apache-2.0
// The values of a rig that are sampled: the sliders of a node, or what a controlCollector collects, with the plugs that
// they come from.
#pragma once

#include "quarn/scene/ValueLimits.h"
#include "quarn/scene/Warp.h"

#include <string>
#include <vector>

namespace quarn {

/// One value of a collector, which may be a node of sliders.
struct PoseControl {
    std::string input; ///< name of the collector's plug; of a slider
    HPlug plug;        ///< connected into it, or the slider's value: set or keyed
    ValueLimits limits;
};

/// The controlCollector, or node of sliders, that is connected into the deformer's poseGenerator, or else the one that
/// feeds its controlValues. Throws std::runtime_error, with what to connect, when there is none. Thread: main.
HObject poseCollector(const Warp& warp);

/// All values of the collector in its order. A slider that a controlCollector collects is sampled itself, between its
/// own limits where the collector has none for it. Throws std::runtime_error, naming the plugs, when there are none;
/// when one has no source, or one that keys cannot be put on; when a source or the name of a slider is there twice; and
/// for limits that are in the wrong order or not finite. Thread: main.
std::vector<PoseControl> poseControls(const HObject& collector);

/// What the plug is a part of: its array or its compound; null when it is neither an element nor a child.
HPlug wholeOf(const HPlug& plug);

/// The plug as users write it: "joint.rotateX", without the compounds on the way where no array is among them.
std::string writtenName(const HPlug& plug);

/// What findControl() finds the plug by: "face.browUp" for the value of a slider whose name no other one of its node
/// has, and writtenName() for every other plug. Thread: main.
std::string controlName(const HPlug& plug);

/// Why no keys can be put on the plug, as in "is locked"; empty when they can. Thread: main.
std::string whyNotKeyable(const HPlug& plug);

} // namespace quarn
