// SPDX-License-Identifier: Apache-2.0
// From the sliders of a rig to the matrices of the skin, the weights of the shapes and the controls of the network.
#pragma once

#include "openquarn/HMatrix.h"
#include "quarn/scene/PoseControls.h"
#include "quarn/view/InputChain.h"

#include <array>
#include <cstdint>
#include <string>
#include <vector>

namespace quarn {

/// Something that is set: a channel of a joint, or a value of its own.
struct RigPlace {
    static constexpr std::uint32_t noJoint = 0xFFFFFFFF;
    std::uint32_t joint = noJoint; ///< among RigChain::joints; noJoint: a free value
    std::uint32_t number = 0;      ///< channel (below), or number of the free value
};

/// Channels of a joint: translate, rotate, jointOrient, scale, each x, y, z.
constexpr std::size_t channelCount = 12;

struct RigChain {
    struct Joint {
        HObject node;
        std::int32_t parent = -1; ///< below its own number
    };
    struct Slider {
        std::string name, group; ///< the group is its node's name
        bool isAngle = false;    ///< radians
        ValueLimits limits;
        RigPlace place;
        HPlug plug;
    };
    /// Where a control of the network comes from, as the core numbers it.
    struct Control {
        enum Kind : std::uint32_t { constant, axes, converted, value, channel };
        Kind kind = constant;
        std::uint32_t source = 0, number = 0, matrix = 0, converter = 0;
    };
    /// What moves without being a slider.
    struct Animated {
        RigPlace place;
        HPlug plug;
    };
    std::vector<Joint> joints; ///< those that are needed, parents first
    std::vector<Slider> sliders;
    std::vector<HPlug> values; ///< free ones
    std::vector<Control> controls;
    std::vector<double> constants;
    std::vector<std::array<std::uint32_t, 2>> converters; ///< what they take of a matrix, as the core has it
    std::vector<Animated> animated;
    std::vector<std::uint32_t> influenceJoints; ///< [influences of the skin]; RigPlace::noJoint: it stands still
    std::vector<std::uint32_t> shapeValues;     ///< [shapes] free values; RigPlace::noJoint: combined
};

/// Traces the chain of a deformer whose network takes `controlCount` controls, in a frame that has been evaluated.
/// Sliders are the deformer's pose controls. Throws NotInPage, naming the plug, where a part of it is of other nodes
/// than a page computes, and std::runtime_error where pose controls cannot be had. Thread: main.
RigChain rigChain(const Warp& warp, const InputChain& chain, const std::vector<SceneJoint>& joints,
                  std::size_t controlCount);

/// The plug of a joint's channel.
HPlug channelPlug(const HObject& joint, std::size_t channel);

} // namespace quarn
