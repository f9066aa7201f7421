// SPDX-License-Identifier: Apache-2.0
#include "rig/animCurveNode.h"

#include "openquarn_helpers/AttributeMaker.h"
#include "openquarn_helpers/guard.h"

namespace rig {

using openquarn_helpers::AttributeMaker;
using openquarn_helpers::guarded;
using openquarn_helpers::outputFlags;

const HTypeId animCurveNode::id(0x6e770012);
const HString animCurveNode::typeName("animCurve");

KeyAttributes animCurveNode::keys;
HObject animCurveNode::drawnKeys;
HObject animCurveNode::output;

animCurveNode::animCurveNode() = default;
animCurveNode::~animCurveNode() = default;

HPxNode* animCurveNode::create() {
    return new (std::nothrow) animCurveNode;
}

HStatus animCurveNode::initialize() {
    AttributeMaker make;
    keys.make(make);
    output = make.real("output", "o", 0.0, outputFlags);
    drawnKeys = make.number("drawnKeys", "dk", HFnNumericData::kInt, 0);
    make.add({drawnKeys, output});
    make.affects(
        {keys.keyTimes, keys.keyValues, keys.keyInTangents, keys.keyOutTangents, keys.interpolation, keys.time},
        {output}, true);
    return make.status();
}

HStatus animCurveNode::compute(const HPlug& plug, HDataBlock& block) {
    return guarded([&]() -> HStatus {
        if (plug.attribute() != output)
            return HStatus::kUnknownParameter;
        Inputs inputs(block);
        const double time = inputs.number(keys.time);
        Interpolation interpolation{};
        HStatus status = keys.read(inputs, track_, interpolation);
        if (status.error())
            return status;
        const double value = track_.keyCount() == 0 ? 0.0 : track_.sample(track_.find(time), interpolation, 0);
        status = block.outputValue(output).set(value);
        return status.error() ? status : block.setClean(plug);
    });
}

} // namespace rig
