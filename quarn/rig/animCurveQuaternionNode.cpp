// SPDX-License-Identifier: Apache-2.0
#include "rig/animCurveQuaternionNode.h"

#include "openquarn_helpers/AttributeMaker.h"
#include "openquarn_helpers/guard.h"

#include "rig/texts.h"

#include "openquarn/HQuaternion.h"

#include <cmath>

namespace rig {

using openquarn_helpers::AttributeMaker;
using openquarn_helpers::guarded;
using openquarn_helpers::outputFlags;

using Node = animCurveQuaternionNode;

const HTypeId Node::id(0x6e770013);
const HString Node::typeName("animCurveQuaternion");

KeyAttributes Node::keys;
HObject Node::rotateOrder;
HObject Node::outputRotateX, Node::outputRotateY, Node::outputRotateZ, Node::outputRotate;

animCurveQuaternionNode::animCurveQuaternionNode() = default;
animCurveQuaternionNode::~animCurveQuaternionNode() = default;

HPxNode* animCurveQuaternionNode::create() {
    return new (std::nothrow) animCurveQuaternionNode;
}

HStatus animCurveQuaternionNode::initialize() {
    AttributeMaker make;
    keys.make(make);
    rotateOrder = make.rotationOrder("rotateOrder", "ro");
    outputRotateX = make.real("outputRotateX", "orx", 0.0, outputFlags);
    outputRotateY = make.real("outputRotateY", "ory", 0.0, outputFlags);
    outputRotateZ = make.real("outputRotateZ", "orz", 0.0, outputFlags);
    outputRotate = make.compound("outputRotate", "or", {outputRotateX, outputRotateY, outputRotateZ}, outputFlags);
    make.add({rotateOrder, outputRotate});
    make.affects({keys.keyTimes, keys.keyValues, keys.keyInTangents, keys.keyOutTangents, keys.interpolation, keys.time,
                  rotateOrder},
                 {outputRotate}, true);
    return make.status();
}

namespace {

HQuaternion keyAt(const KeyTrack& track, std::size_t key) {
    const std::span<const double> parts = track.value(key);
    return {parts[0], parts[1], parts[2], parts[3]};
}

HStatus checkKey(const KeyTrack& track, std::size_t key) {
    const double length = keyAt(track, key).length();
    if (length > 0.0 && std::isfinite(length))
        return HStatus::kSuccess;
    return {HStatus::kFailure, "the quaternion of key " + std::to_string(key) + " (" + element("keyValues", 4 * key) +
                                   " and the three after it) has the length " + text(length) + ": it is no rotation"};
}

HQuaternion rotationAt(const KeyTrack& track, const KeyPlace& place, Interpolation interpolation) {
    if (interpolation == Interpolation::linear)
        return HQuaternion::slerp(keyAt(track, place.before).normal(), keyAt(track, place.after).normal(),
                                  place.fraction);
    const auto component = [&](std::size_t index) { return track.sample(place, interpolation, index); };
    return HQuaternion(component(0), component(1), component(2), component(3)).normal();
}

/// The identity without keys.
HStatus sampleRotation(const KeyTrack& track, double time, Interpolation interpolation, HQuaternion& rotation) {
    if (track.keyCount() == 0)
        return HStatus::kSuccess;
    const KeyPlace place = track.find(time);
    for (const std::size_t key : {place.before, place.after})
        if (HStatus status = checkKey(track, key); status.error())
            return status;
    rotation = rotationAt(track, place, interpolation);
    return HStatus::kSuccess;
}

} // namespace

HStatus animCurveQuaternionNode::compute(const HPlug& plug, HDataBlock& block) {
    return guarded([&]() -> HStatus {
        const HObject asked = plug.attribute();
        if (asked != outputRotate && asked != outputRotateX && asked != outputRotateY && asked != outputRotateZ)
            return HStatus::kUnknownParameter;
        Inputs inputs(block);
        const double time = inputs.number(keys.time);
        const HEulerRotation::RotationOrder order = inputs.rotationOrder(rotateOrder);
        Interpolation interpolation{};
        HStatus status = keys.read(inputs, track_, interpolation);
        HQuaternion rotation;
        if (!status.error())
            status = sampleRotation(track_, time, interpolation, rotation);
        if (status.error())
            return status;
        const HEulerRotation angles = rotation.asEulerRotation(order);
        // one computation serves all three
        unsigned axis = 0;
        for (const HObject& output : {outputRotateX, outputRotateY, outputRotateZ})
            if (!status.error())
                status = block.outputValue(output).set(angles[axis++]);
        return status.error() ? status : block.setClean(outputRotate);
    });
}

} // namespace rig
