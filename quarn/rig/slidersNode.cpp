// SPDX-License-Identifier: Apache-2.0
#include "rig/slidersNode.h"

#include "openquarn/HDataBlock.h"
#include "openquarn_helpers/AttributeMaker.h"
#include "openquarn_helpers/guard.h"

#include <algorithm>
#include <vector>

namespace rig {

using openquarn_helpers::AttributeFlags;
using openquarn_helpers::AttributeMaker;
using openquarn_helpers::guarded;

using Node = slidersNode;

const HTypeId Node::id(0x6e770023);
const HString Node::typeName("sliders");

HObject Node::slider;
HObject Node::sliderName;
HObject Node::value;
HObject Node::minValue;
HObject Node::maxValue;
HObject Node::defaultValue;
HObject Node::samples;
HObject Node::activationRate;
HObject Node::samplesStartFrame;
HObject Node::output;

slidersNode::slidersNode() = default;
slidersNode::~slidersNode() = default;

HPxNode* slidersNode::create() {
    return new (std::nothrow) slidersNode;
}

HStatus slidersNode::initialize() {
    constexpr AttributeFlags setting{.keyable = false};
    constexpr AttributeFlags builtOutput{
        .array = true, .builder = true, .writable = false, .storable = false, .keyable = false};
    AttributeMaker make;
    sliderName = make.data("sliderName", "sn", HFnData::kString);
    value = make.real("value", "v");
    minValue = make.real("minValue", "mnv", 0.0, setting);
    maxValue = make.real("maxValue", "mxv", 1.0, setting);
    defaultValue = make.real("defaultValue", "dv", 0.0, setting);
    slider = make.compound("slider", "sl", {sliderName, value, minValue, maxValue, defaultValue}, {.array = true});
    // as a controlCollector has them: whoever samples finds both alike
    samples = make.number("samples", "sa", HFnNumericData::kInt, 1000.0, setting, {.min = 1.0});
    activationRate =
        make.number("activationRate", "ar", HFnNumericData::kDouble, 0.2, setting, {.min = 0.0, .max = 1.0});
    samplesStartFrame = make.number("samplesStartFrame", "ssf", HFnNumericData::kInt, 1.0, setting);
    output = make.real("output", "out", 0.0, builtOutput);
    make.add({slider, samples, activationRate, samplesStartFrame, output});
    make.affects({slider}, {output}, true);
    return make.status();
}

namespace {

/// The indices of the elements, ascending.
std::vector<unsigned> indicesOf(HArrayDataHandle& array) {
    std::vector<unsigned> indices;
    for (unsigned i = 0; i < array.elementCount() && !array.jumpToPosition(i).error(); ++i)
        indices.push_back(array.elementIndex());
    return indices;
}

/// Adds an element for each slider, with its value.
HStatus addValues(HArrayDataHandle& sliders, HArrayDataBuilder& builder) {
    HStatus status;
    for (unsigned i = 0; i < sliders.elementCount() && !status.error(); ++i) {
        status = sliders.jumpToPosition(i);
        const HDataHandle at = status.error() ? HDataHandle() : sliders.inputValue(&status);
        HDataHandle place = status.error() ? HDataHandle() : builder.addElement(sliders.elementIndex(), &status);
        if (!status.error())
            status = place.set(at.child(Node::value).asDouble());
    }
    return status;
}

HStatus removeOthers(const std::vector<unsigned>& wanted, const std::vector<unsigned>& present,
                     HArrayDataBuilder& builder) {
    HStatus status;
    for (const unsigned index : present)
        if (!status.error() && !std::binary_search(wanted.begin(), wanted.end(), index))
            status = builder.removeElement(index);
    return status;
}

} // namespace

HStatus slidersNode::compute(const HPlug& plug, HDataBlock& block) {
    return guarded([&]() -> HStatus {
        if (plug.attribute() != output)
            return HStatus::kUnknownParameter;
        HStatus status;
        HArrayDataHandle sliders = block.inputArrayValue(slider, &status);
        HArrayDataHandle outputs = status.error() ? HArrayDataHandle() : block.outputArrayValue(output, &status);
        HArrayDataBuilder builder = status.error() ? HArrayDataBuilder() : outputs.builder(&status);
        if (!status.error())
            status = addValues(sliders, builder);
        if (!status.error())
            status = removeOthers(indicesOf(sliders), indicesOf(outputs), builder);
        if (!status.error())
            status = outputs.set(builder);
        return status.error() ? status : outputs.setAllClean();
    });
}

} // namespace rig
