// SPDX-License-Identifier: Apache-2.0
#include "controls/controlCollectorNode.h"

#include "controls/arrayOutput.h"
#include "controls/guardedCompute.h"
#include "openquarn/HDGModifier.h"
#include "openquarn_helpers/AttributeMaker.h"

#include <vector>

namespace neuralWarp {

using openquarn_helpers::AttributeFlags;
using openquarn_helpers::AttributeMaker;

const HTypeId controlCollectorNode::id(0x58000973);
const HString controlCollectorNode::typeName("controlCollector");

HObject controlCollectorNode::inputList;
HObject controlCollectorNode::input;
HObject controlCollectorNode::limitsList;
HObject controlCollectorNode::limits;
HObject controlCollectorNode::minValue;
HObject controlCollectorNode::maxValue;
HObject controlCollectorNode::defaultValue;
HObject controlCollectorNode::samples;
HObject controlCollectorNode::activationRate;
HObject controlCollectorNode::samplesStartFrame;
HObject controlCollectorNode::output;

controlCollectorNode::controlCollectorNode() = default;
controlCollectorNode::~controlCollectorNode() = default;

HPxNode* controlCollectorNode::create() {
    return new (std::nothrow) controlCollectorNode;
}

HStatus controlCollectorNode::initialize() {
    constexpr auto real = HFnNumericData::kDouble;
    constexpr AttributeFlags list{.array = true, .onDisconnect = HFnAttribute::kDelete};
    constexpr AttributeFlags builtList{.array = true, .builder = true, .onDisconnect = HFnAttribute::kDelete};
    constexpr AttributeFlags setting{.keyable = false};

    AttributeMaker attributes;
    input = attributes.number("input", "in", real, 0.0, list);
    inputList = attributes.compound("inputList", "inl", {input}, builtList);
    minValue = attributes.number("minValue", "mnv", real, 0.0, setting);
    maxValue = attributes.number("maxValue", "mxv", real, 1.0, setting);
    defaultValue = attributes.number("defaultValue", "dv", real, 0.0, setting);
    limits = attributes.compound("limits", "lim", {minValue, maxValue, defaultValue}, list);
    limitsList = attributes.compound("limitsList", "liml", {limits}, builtList);
    samples = attributes.number("samples", "sa", HFnNumericData::kInt, 1000.0, setting, {.min = 1.0});
    activationRate = attributes.number("activationRate", "ar", real, 0.2, setting, {.min = 0.0, .max = 1.0});
    samplesStartFrame = attributes.number("samplesStartFrame", "ssf", HFnNumericData::kInt, 1.0, setting);
    output = attributes.number("output", "out", real, 0.0, {.array = true, .builder = true, .writable = false});

    attributes.add({inputList, limitsList, samples, activationRate, samplesStartFrame, output});
    attributes.affects({inputList}, {output}, true);
    return attributes.status();
}

namespace {

// a value that cannot be read ends its list
void appendList(HArrayDataHandle& list, std::vector<double>& values) {
    const unsigned count = list.elementCount();
    for (unsigned position = 0; position < count; ++position) {
        if (position > 0 && list.next().error())
            return;
        HStatus status;
        const HDataHandle value = list.inputValue(&status);
        if (status.error())
            return;
        values.push_back(value.asDouble());
    }
}

HStatus appendLists(HArrayDataHandle& lists, std::vector<double>& values) {
    HStatus status;
    const unsigned count = lists.elementCount();
    for (unsigned position = 0; position < count; ++position) {
        if (position > 0)
            if (status = lists.next(); status.error())
                return status;
        const HDataHandle element = lists.inputValue(&status);
        if (status.error())
            return status;
        HArrayDataHandle list = element.childArray(controlCollectorNode::input, &status);
        if (status.error())
            return status;
        appendList(list, values);
    }
    return status;
}

void removeElements(const HPlug& array) {
    HDGModifier modifier;
    for (unsigned position = array.numElements(); position > 0; --position)
        modifier.removeMultiInstance(array.elementByPhysicalIndex(position - 1), false);
    modifier.doIt();
}

} // namespace

HStatus controlCollectorNode::compute(const HPlug&, HDataBlock& block) {
    return guardedCompute(*this, "controlCollectorNode::compute", [&]() -> HStatus {
        HStatus status;
        HArrayDataHandle lists = block.inputArrayValue(inputList, &status);
        if (status.error() || lists.elementCount() == 0)
            return status;
        std::vector<double> values;
        if (status = appendLists(lists, values); status.error())
            return status;
        HArrayDataHandle outputs = block.outputArrayValue(output, &status);
        if (status.error())
            return status;
        writeElements(outputs, values, Surplus::remove);
        return HStatus::kSuccess;
    });
}

HStatus controlCollectorNode::connectionBroken(const HPlug& plug, const HPlug& otherPlug, bool asSource) {
    return guarded(*this, "controlCollectorNode::connectionBroken", [&] {
        if (!asSource && plug == input && plug.isArray() && plug.numElements() > 0)
            removeElements(plug);
        return HPxNode::connectionBroken(plug, otherPlug, asSource);
    });
}

} // namespace neuralWarp
