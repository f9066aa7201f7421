// SPDX-License-Identifier: Apache-2.0
#include "quarn/view/RigChain.h"

#include "openquarn/HFnAttribute.h"
#include "openquarn/HFnDependencyNode.h"
#include "quarn/scene/controlSource.h"
#include "quarn/scene/plugs.h"
#include "quarn/scene/sliders.h"
#include "quarn/view/NotInPage.h"

#include <algorithm>
#include <map>
#include <optional>
#include <set>

namespace quarn {
namespace {

constexpr const char* jointType = "joint";
constexpr std::array<const char*, channelCount> channelNames = {
    "translateX",   "translateY",   "translateZ",   "rotateX", "rotateY", "rotateZ",
    "jointOrientX", "jointOrientY", "jointOrientZ", "scaleX",  "scaleY",  "scaleZ"};
constexpr std::array<const char*, 3> matrixNames = {"relativeMatrix", "worldMatrix", "matrix"};

// the first word of a converter, bit by bit
constexpr std::array<const char*, 12> switchNames = {
    "extractRotation", "extractScale", "extractTranslation", "rotationX",    "rotationY",   "rotationZ", "scaleX",
    "scaleY",          "scaleZ",       "translationX",       "translationY", "translationZ"};

std::string nameOf(const HPlug& plug) {
    return plug.name().asChar();
}

std::string attributeOf(const HPlug& plug) {
    return HFnAttribute(plug.attribute()).name().asChar();
}

template <std::size_t size>
std::optional<std::uint32_t> placeIn(const std::array<const char*, size>& names, const std::string& name) {
    const auto place = std::find(names.begin(), names.end(), name);
    return place == names.end() ? std::nullopt : std::optional(static_cast<std::uint32_t>(place - names.begin()));
}

// what is connected into the plug, or into a whole that it is a part of
HPlug sourceInto(const HPlug& plug) {
    for (HPlug place = plug; !place.isNull(); place = wholeOf(place))
        if (HPlug source = place.source(); !source.isNull())
            return source;
    return {};
}

// a value that may move by itself: nothing else of the scene is told by it
bool isSliderPlug(const HPlug& plug) {
    return !sliderBehind(plug).isNull();
}

class Tracer {
public:
    Tracer(const Warp& warp, const InputChain& chain, const std::vector<SceneJoint>& joints)
        : warp_(warp)
        , chain_(chain)
        , sceneJoints_(joints)
        , poses_(poseControls(poseCollector(warp))) {}

    RigChain trace(std::size_t controlCount) {
        const std::vector<ControlSource> sources = controlSources(controlCount);
        takeJoints(sources);
        for (const PoseControl& pose : poses_)
            addSlider(pose);
        for (const ControlSource& source : sources)
            addControl(source);
        for (const InputChain::Shape& shape : chain_.shapes)
            addShape(shape);
        for (const InputChain::Influence& influence : chain_.influences)
            addInfluence(influence);
        for (std::size_t joint = 0; joint < rig_.joints.size(); ++joint)
            addChannels(static_cast<std::uint32_t>(joint));
        for (std::size_t value = 0; value < rig_.values.size(); ++value)
            addValue(static_cast<std::uint32_t>(value));
        return std::move(rig_);
    }

private:
    std::vector<ControlSource> controlSources(std::size_t count) const {
        const HPlug array = warp_.plug("controlValues");
        std::vector<ControlSource> sources;
        for (const unsigned index : indicesOf(array))
            if (sources.size() < count)
                sources.push_back(controlSource(array.elementByLogicalIndex(index)));
        return sources;
    }

    // --- joints ---

    void need(std::size_t joint, std::vector<bool>& needed) const {
        for (int i = static_cast<int>(joint); i >= 0 && !needed[static_cast<std::size_t>(i)];
             i = sceneJoints_[static_cast<std::size_t>(i)].parent)
            needed[static_cast<std::size_t>(i)] = true;
    }
    void need(const HPlug& plug, std::vector<bool>& needed) const {
        if (const auto joint = indexOfJoint(sceneJoints_, plug.node()))
            need(*joint, needed);
    }

    void takeJoints(const std::vector<ControlSource>& sources) {
        std::vector<bool> needed(sceneJoints_.size(), false);
        for (const InputChain::Influence& influence : chain_.influences)
            if (influence.joint != InputChain::Influence::none)
                need(influence.joint, needed);
        for (const ControlSource& source : sources)
            need(source.plug, needed);
        for (const PoseControl& pose : poses_)
            need(pose.plug, needed);
        for (std::size_t i = 0; i < sceneJoints_.size(); ++i)
            if (needed[i])
                addJoint(sceneJoints_[i]);
    }

    void addJoint(const SceneJoint& joint) {
        if (joint.held)
            throw NotInPage("the joint " + joint.name + " hangs on " + *joint.held + ", which is no joint's");
        for (const char* fixed : {"rotateOrder", "restMatrix"})
            if (const HPlug source = sourceOf(joint.node, fixed); !source.isNull())
                throw NotInPage(nameOf(source) + " is connected into " + joint.name + "." + fixed);
        const std::int32_t parent =
            joint.parent < 0
                ? -1
                : static_cast<std::int32_t>(jointOf(sceneJoints_[static_cast<std::size_t>(joint.parent)].node));
        numberOfJoint_.emplace(joint.name, static_cast<std::uint32_t>(rig_.joints.size()));
        rig_.joints.push_back({joint.node, parent});
    }

    std::uint32_t jointOf(const HObject& node) const { return numberOfJoint_.at(nodeName(node)); }

    // --- what is set ---

    // none: the plug is neither a joint's channel nor a slider
    std::optional<RigPlace> placeOf(const HPlug& plug) {
        if (nodeType(plug.node()) == jointType) {
            const auto channel = placeIn(channelNames, attributeOf(plug));
            return channel ? std::optional(RigPlace{jointOf(plug.node()), *channel}) : std::nullopt;
        }
        if (const HPlug slider = sliderBehind(plug); !slider.isNull())
            return RigPlace{RigPlace::noJoint, freeValue(valueOf(slider))};
        return std::nullopt;
    }

    std::uint32_t freeValue(const HPlug& plug) {
        const auto [known, isNew] = numberOfValue_.emplace(nameOf(plug), rig_.values.size());
        if (isNew)
            rig_.values.push_back(plug);
        return static_cast<std::uint32_t>(known->second);
    }

    void addSlider(const PoseControl& pose) {
        const std::optional<RigPlace> place = placeOf(pose.plug);
        if (!place)
            throw NotInPage("the control " + writtenName(pose.plug) + " is of a node of type " +
                            nodeType(pose.plug.node()) + ", and a page moves joints and sliders");
        constexpr std::uint32_t firstAngle = 3, lastAngle = 8;
        const bool isAngle =
            place->joint != RigPlace::noJoint && place->number >= firstAngle && place->number <= lastAngle;
        rig_.sliders.push_back(
            {controlName(pose.plug), nodeName(pose.plug.node()), isAngle, pose.limits, *place, pose.plug});
        sliderNodes_.insert(nodeName(pose.plug.node()));
        sliderPlugs_.insert(nameOf(pose.plug));
    }

    // --- controls ---

    void addConstant(const HPlug& plug) {
        rig_.controls.push_back({RigChain::Control::constant, static_cast<std::uint32_t>(rig_.constants.size())});
        rig_.constants.push_back(numberOf(plug));
    }

    void addControl(const ControlSource& source) {
        if (!source.converter.isNull())
            return addConverted(source);
        if (const std::optional<RigPlace> place = placeOf(source.plug)) {
            const bool isChannel = place->joint != RigPlace::noJoint;
            rig_.controls.push_back({isChannel ? RigChain::Control::channel : RigChain::Control::value,
                                     isChannel ? place->joint : place->number, isChannel ? place->number : 0});
            return;
        }
        if (!source.plug.isSource() && sourceInto(source.plug).isNull())
            return addConstant(source.plug);
        rig_.controls.push_back({RigChain::Control::value, freeValue(source.plug)});
    }

    void addConverted(const ControlSource& source) {
        const bool isJoint = nodeType(source.plug.node()) == jointType;
        const auto matrix = isJoint ? placeIn(matrixNames, attributeOf(source.plug)) : std::nullopt;
        if (!matrix)
            throw NotInPage("a control comes from the matrix " + nameOf(source.plug) + ", which is no joint's");
        const bool isAxes = nodeType(source.converter) == axesType;
        rig_.controls.push_back({isAxes ? RigChain::Control::axes : RigChain::Control::converted,
                                 jointOf(source.plug.node()), source.number, *matrix,
                                 isAxes ? 0 : converterOf(source.converter)});
    }

    std::uint32_t converterOf(const HObject& node) {
        const auto [known, isNew] = numberOfConverter_.emplace(nodeName(node), rig_.converters.size());
        if (isNew) {
            std::uint32_t switches = 0;
            for (std::size_t bit = 0; bit < switchNames.size(); ++bit)
                switches |= numberOf(plugOf(node, switchNames[bit])) != 0.0 ? 1U << bit : 0U;
            rig_.converters.push_back(
                {switches, static_cast<std::uint32_t>(wholeNumberOf(plugOf(node, "rotationConversion")))});
        }
        return static_cast<std::uint32_t>(known->second);
    }

    // --- shapes and skin ---

    void addShape(const InputChain::Shape& shape) {
        if (!shape.factors.empty()) {
            rig_.shapeValues.push_back(RigPlace::noJoint);
            return;
        }
        const HPlug source = shape.weight.source();
        const std::optional<RigPlace> place = source.isNull() ? std::nullopt : placeOf(source);
        if (place && place->joint != RigPlace::noJoint)
            throw NotInPage("the weight " + nameOf(shape.weight) + " follows the joint channel " + nameOf(source));
        rig_.shapeValues.push_back(place ? place->number : freeValue(shape.weight));
    }

    void addInfluence(const InputChain::Influence& influence) {
        const HPlug source = influence.matrix.source();
        if (influence.joint == InputChain::Influence::none && !source.isNull())
            throw NotInPage("the skin follows " + nameOf(source) + ", which is no joint's");
        const bool isJoint = influence.joint != InputChain::Influence::none;
        rig_.influenceJoints.push_back(isJoint ? jointOf(sceneJoints_[influence.joint].node) : RigPlace::noJoint);
    }

    // --- what moves otherwise ---

    void addChannels(std::uint32_t joint) {
        for (std::uint32_t channel = 0; channel < channelCount; ++channel)
            addAnimated({joint, channel}, channelPlug(rig_.joints[joint].node, channel));
    }
    void addValue(std::uint32_t value) { addAnimated({RigPlace::noJoint, value}, rig_.values[value]); }

    void addAnimated(const RigPlace& place, const HPlug& plug) {
        if (sliderPlugs_.count(nameOf(plug)) > 0)
            return;
        const HPlug source = sourceInto(plug);
        const bool isOutput =
            source.isNull() && plug.isSource() && !isSliderPlug(plug) && nodeType(plug.node()) != jointType;
        if (source.isNull() && !isOutput)
            return;
        if (const std::string slider = sliderAbove(source.isNull() ? plug : source); !slider.empty())
            throw NotInPage(nameOf(plug) + " follows " + slider + " through other nodes than a page computes");
        rig_.animated.push_back({place, plug});
    }

    // a slider that the plug depends on, by name; empty without one
    std::string sliderAbove(const HPlug& from) const {
        std::set<std::string> visited;
        std::vector<HPlug> open = {from};
        while (!open.empty()) {
            const HPlug plug = open.back();
            open.pop_back();
            const HPlug slider = sliderBehind(plug);
            if (!slider.isNull()) {
                const HPlug value = valueOf(slider);
                if (sliderPlugs_.count(nameOf(value)) > 0)
                    return sliderName(slider);
                if (const HPlug source = sourceInto(value); !source.isNull() && visited.insert(nameOf(value)).second)
                    open.push_back(source);
                continue;
            }
            std::string node = nodeName(plug.node());
            if (sliderNodes_.count(node) > 0)
                return node;
            if (!visited.insert(node).second)
                continue;
            HPlugArray inputs;
            if (!HFnDependencyNode(plug.node()).getConnections(inputs).error())
                for (const HPlug& input : inputs)
                    if (const HPlug source = input.source(); !source.isNull())
                        open.push_back(source);
        }
        return {};
    }

    const Warp& warp_;
    const InputChain& chain_;
    const std::vector<SceneJoint>& sceneJoints_;
    std::vector<PoseControl> poses_;
    RigChain rig_;
    std::map<std::string, std::uint32_t> numberOfJoint_;
    std::map<std::string, std::size_t> numberOfValue_, numberOfConverter_;
    std::set<std::string> sliderNodes_, sliderPlugs_;
};

} // namespace

RigChain rigChain(const Warp& warp, const InputChain& chain, const std::vector<SceneJoint>& joints,
                  std::size_t controlCount) {
    return Tracer(warp, chain, joints).trace(controlCount);
}

HPlug channelPlug(const HObject& joint, std::size_t channel) {
    return plugOf(joint, channelNames.at(channel));
}

} // namespace quarn
