// SPDX-License-Identifier: Apache-2.0
#include "quarn/scene/sliders.h"

#include "openquarn/HFnAttribute.h"
#include "quarn/scene/plugs.h"

#include <stdexcept>

namespace quarn {
namespace {

std::string attributeName(const HPlug& plug) {
    return HFnAttribute(plug.attribute()).name().asChar();
}

HPlug sliderAt(const HObject& node, unsigned index) {
    return plugOf(node, "slider[" + std::to_string(index) + "]");
}

HPlug childOf(const HPlug& slider, const char* name) {
    return findPlug(std::string(slider.name().asChar()) + "." + name);
}

// nodes of this type whose name is what stands before the dot: one or none
std::vector<HPlug> slidersOfNode(const std::string& name) {
    for (const HObject& node : nodesOfType(slidersType))
        if (nodeName(node) == name)
            return slidersOf(node);
    return {};
}

} // namespace

HPlug sliderBehind(const HPlug& plug) {
    if (plug.isNull() || nodeType(plug.node()) != slidersType)
        return {};
    if (attributeName(plug) == "output" && plug.isElement())
        return sliderAt(plug.node(), plug.logicalIndex());
    return attributeName(plug) == "value" && plug.isChild() ? plug.parent() : HPlug();
}

std::string sliderName(const HPlug& slider) {
    const std::string name = textOf(childOf(slider, "sliderName"));
    return name.empty() ? slider.name().asChar() : nodeName(slider.node()) + "." + name;
}

HPlug valueOf(const HPlug& slider) {
    return childOf(slider, "value");
}

std::vector<HPlug> slidersOf(const HObject& node) {
    std::vector<HPlug> sliders;
    for (const unsigned index : indicesOf(plugOf(node, "slider")))
        sliders.push_back(sliderAt(node, index));
    return sliders;
}

HPlug findControl(const std::string& name) {
    HPlug found;
    for (const HPlug& slider : slidersOfNode(name.substr(0, name.find('.')))) {
        if (sliderName(slider) != name)
            continue;
        if (!found.isNull())
            throw std::runtime_error(name + " is the name of both " + found.name().asChar() + " and " +
                                     slider.name().asChar());
        found = slider;
    }
    return found.isNull() ? findPlug(name) : valueOf(found);
}

} // namespace quarn
