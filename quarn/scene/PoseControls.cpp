// SPDX-License-Identifier: Apache-2.0
#include "quarn/scene/PoseControls.h"

#include "openquarn/HFnAttribute.h"
#include "openquarn_app/Evaluation.h"
#include "openquarn_app/NodeTypes.h"
#include "quarn/console/numberText.h"
#include "quarn/scene/plugs.h"
#include "quarn/scene/sliders.h"

#include <algorithm>
#include <cmath>
#include <map>
#include <stdexcept>

namespace quarn {
namespace {

constexpr const char* collectorType = "controlCollector";

std::string element(const std::string& array, unsigned index) {
    return array + "[" + std::to_string(index) + "]";
}

// plugs that something is wrong with, for one sentence
class Complaints {
public:
    void add(const std::string& what) {
        constexpr std::size_t most = 10;
        if (++count_ <= most)
            text_ += (text_.empty() ? "" : "; ") + what;
    }
    void throwIfAny(const std::string& beginning) const {
        const std::string more = count_ > 10 ? "; and " + std::to_string(count_ - 10) + " more" : "";
        if (count_ > 0)
            throw std::runtime_error(beginning + ": " + text_ + more);
    }

private:
    std::size_t count_ = 0;
    std::string text_;
};

std::string whatIsWrong(const ValueLimits& limits) {
    if (!std::isfinite(limits.least) || !std::isfinite(limits.most) || !std::isfinite(limits.rest))
        return "are not finite";
    if (limits.least > limits.most)
        return "are in the wrong order";
    return std::isfinite(limits.most - limits.least) ? "" : "are too far apart";
}

// of a plug with the children minValue, maxValue and defaultValue
ValueLimits limitsOf(const std::string& plug, Complaints& complaints) {
    ValueLimits limits;
    limits.least = numberOf(findPlug(plug + ".minValue"));
    limits.most = numberOf(findPlug(plug + ".maxValue"));
    limits.rest = numberOf(findPlug(plug + ".defaultValue"));
    if (const std::string wrong = whatIsWrong(limits); !wrong.empty())
        complaints.add(plug + " " + wrong + ": " + numberText(limits.least) + " to " + numberText(limits.most) +
                       ", default " + numberText(limits.rest));
    return limits;
}

bool hasElement(const HPlug& array, unsigned index) {
    const std::vector<unsigned> indices = indicesOf(array);
    return std::find(indices.begin(), indices.end(), index) != indices.end();
}

bool hasLimits(const HObject& collector, unsigned list, unsigned value) {
    return hasElement(plugOf(collector, "limitsList"), list) &&
           hasElement(plugOf(collector, element("limitsList", list) + ".limits"), value);
}

void checkSource(const PoseControl& control, std::map<std::string, std::string>& inputBySource, Complaints& problems) {
    if (control.plug.isNull()) {
        problems.add(control.input + " has no source");
        return;
    }
    const std::string source = writtenName(control.plug);
    if (const std::string why = whyNotKeyable(control.plug); !why.empty())
        problems.add(source + " (into " + control.input + ") " + why);
    if (const auto [known, isNew] = inputBySource.emplace(source, control.input); !isNew)
        problems.add(source + " is the source of both " + known->second + " and " + control.input);
}

// nobody could tell them apart in a data set, nor in a file of keys
void checkNames(const std::vector<PoseControl>& sliders, Complaints& problems) {
    std::map<std::string, std::string> plugByName;
    for (const PoseControl& slider : sliders) {
        const std::string plug = writtenName(slider.plug);
        if (const auto [known, isNew] = plugByName.emplace(slider.input, plug); !isNew)
            problems.add(slider.input + " is the name of both " + known->second + " and " + plug);
    }
}

// some outputs can be set, but what their node computes is written over that
bool isComputed(const HPlug& plug) {
    const std::vector<OpenQuarn::AffectsInfo> dependencies = OpenQuarn::dependenciesOf(nodeType(plug.node()));
    for (HObject attribute = plug.attribute(); !attribute.isNull(); attribute = HFnAttribute(attribute).parent()) {
        const std::string name = HFnAttribute(attribute).name().asChar();
        for (const OpenQuarn::AffectsInfo& dependency : dependencies)
            if (dependency.affected == name)
                return true;
    }
    return false;
}

HObject collectorAt(const HPlug& source) {
    const std::string type = source.isNull() ? "" : nodeType(source.node());
    return type == collectorType || type == slidersType ? source.node() : HObject();
}

PoseControl collectedControl(const HObject& collector, unsigned list, unsigned value, Complaints& complaints) {
    const HPlug input = plugOf(collector, element(element("inputList", list) + ".input", value));
    PoseControl control{input.name().asChar(), input.source(), {}};
    std::string limits = nodeName(collector) + "." + element(element("limitsList", list) + ".limits", value);
    if (const HPlug slider = sliderBehind(control.plug); !slider.isNull()) {
        control.plug = valueOf(slider);
        if (!hasLimits(collector, list, value))
            limits = slider.name().asChar();
    }
    control.limits = limitsOf(limits, complaints);
    return control;
}

std::vector<PoseControl> collectedControls(const HObject& collector, Complaints& complaints) {
    // what a connection of a whole list brings is there once it has been evaluated
    if (const HStatus status = OpenQuarn::evaluate(plugOf(collector, "output")); status.error())
        throw std::runtime_error(nodeName(collector) + ": " + status.errorString().asChar());
    std::vector<PoseControl> controls;
    for (const unsigned list : indicesOf(plugOf(collector, "inputList")))
        for (const unsigned value : indicesOf(plugOf(collector, element("inputList", list) + ".input")))
            controls.push_back(collectedControl(collector, list, value, complaints));
    if (controls.empty())
        throw std::runtime_error(nodeName(collector) + " collects nothing: connect the plugs to sample into " +
                                 nodeName(collector) + ".inputList[0].input[0] and so on");
    return controls;
}

std::vector<PoseControl> sliderControls(const HObject& node, Complaints& complaints) {
    std::vector<PoseControl> controls;
    for (const HPlug& slider : slidersOf(node))
        controls.push_back({sliderName(slider), valueOf(slider), limitsOf(slider.name().asChar(), complaints)});
    if (controls.empty())
        throw std::runtime_error(nodeName(node) + " has no sliders: set " + nodeName(node) +
                                 ".slider[0].sliderName and so on");
    return controls;
}

} // namespace

HObject poseCollector(const Warp& warp) {
    if (const HPlug generator = warp.plug("poseGenerator").source(); !generator.isNull()) {
        HObject collector = collectorAt(generator);
        if (collector.isNull())
            throw std::runtime_error(std::string(generator.name().asChar()) + " is connected into " + warp.name +
                                     ".poseGenerator, and is no " + collectorType);
        return collector;
    }
    const HPlug values = warp.plug("controlValues");
    HObject collector = collectorAt(values.source());
    for (const unsigned index : indicesOf(values))
        if (collector.isNull())
            collector = collectorAt(values.elementByLogicalIndex(index).source());
    if (collector.isNull())
        throw std::runtime_error(warp.name + " has no controls to sample: connect the message of a " + collectorType +
                                 " or of " + slidersType + " into " + warp.name + ".poseGenerator");
    return collector;
}

HPlug wholeOf(const HPlug& plug) {
    return plug.isElement() ? plug.array() : plug.isChild() ? plug.parent() : HPlug();
}

std::string writtenName(const HPlug& plug) {
    for (HPlug place = plug; !place.isNull(); place = wholeOf(place))
        if (place.isElement())
            return plug.name().asChar();
    return nodeName(plug.node()) + "." + HFnAttribute(plug.attribute()).name().asChar();
}

std::string controlName(const HPlug& plug) {
    const HPlug slider = sliderBehind(plug);
    if (slider.isNull() || plug != valueOf(slider))
        return writtenName(plug);
    std::string name = sliderName(slider);
    const std::vector<HPlug> all = slidersOf(plug.node());
    const auto hasName = [&](const HPlug& other) { return sliderName(other) == name; };
    return std::count_if(all.begin(), all.end(), hasName) == 1 ? name : writtenName(plug);
}

std::string whyNotKeyable(const HPlug& plug) {
    const HFnAttribute attribute(plug.attribute());
    if (plug.isArray() || !plug.attribute().hasFn(HFn::kNumericAttribute))
        return "is no number";
    if (!attribute.isWritable() || isComputed(plug))
        return "is an output";
    if (!attribute.isConnectable())
        return "cannot be connected into";
    for (HPlug place = plug; !place.isNull(); place = wholeOf(place))
        if (place.isLocked())
            return place == plug ? "is locked" : "is locked, as a part of " + writtenName(place);
    return {};
}

std::vector<PoseControl> poseControls(const HObject& collector) {
    Complaints sources;
    Complaints limits;
    const bool hasSliders = nodeType(collector) == slidersType;
    std::vector<PoseControl> controls =
        hasSliders ? sliderControls(collector, limits) : collectedControls(collector, limits);
    std::map<std::string, std::string> inputBySource;
    for (const PoseControl& control : controls)
        checkSource(control, inputBySource, sources);
    if (hasSliders)
        checkNames(controls, sources);
    const std::string name = nodeName(collector);
    sources.throwIfAny("the controls of " + name + " cannot be sampled");
    limits.throwIfAny("the limits of " + name + " cannot be used");
    return controls;
}

} // namespace quarn
