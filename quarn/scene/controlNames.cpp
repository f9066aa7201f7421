// SPDX-License-Identifier: Apache-2.0
#include "quarn/scene/controlNames.h"

#include "quarn/scene/Warp.h"
#include "quarn/scene/plugs.h"
#include "quarn/scene/sliders.h"

#include <algorithm>
#include <set>

namespace quarn {
namespace {

// a slider by its own name; else without the compounds on the way, which a plug can be found without: "arm.rotateZ"
std::string nameOf(const HPlug& plug) {
    if (const HPlug slider = sliderBehind(plug); !slider.isNull())
        return sliderName(slider);
    const std::string path = plug.partialName().asChar();
    const bool isPlain = path.find('[') == std::string::npos;
    return nodeName(plug.node()) + "." + (isPlain ? path.substr(path.rfind('.') + 1) : path);
}

std::string list(const char* name, unsigned index) {
    return std::string(name) + "[" + std::to_string(index) + "]";
}

std::string attributeOf(const HPlug& plug) {
    std::string name = plug.partialName().asChar();
    return name.substr(0, name.find('['));
}

// the value that a collector gives at this position; null when there is none
HPlug collected(const HObject& collector, std::size_t position) {
    for (const unsigned group : indicesOf(plugOf(collector, "inputList"))) {
        const HPlug inputs = plugOf(collector, list("inputList", group) + ".input");
        const std::vector<unsigned> indices = indicesOf(inputs);
        if (position < indices.size())
            return inputs.elementByLogicalIndex(indices[position]);
        position -= indices.size();
    }
    return {};
}

// the matrix behind a number of a converter, and which of its numbers that is
std::string converted(const HPlug& output) {
    const HObject node = output.node();
    unsigned number = output.logicalIndex();
    HPlug matrix;
    if (attributeOf(output) == "outputList") {
        matrix = plugOf(node, list("input", output.array().parent().logicalIndex()));
    } else {
        const std::vector<unsigned> inputs = indicesOf(plugOf(node, "input"));
        const std::size_t numbers = indicesOf(output.array()).size();
        const auto each = static_cast<unsigned>(inputs.empty() ? 0 : numbers / inputs.size());
        if (each == 0 || number / each >= inputs.size())
            return nameOf(output);
        matrix = plugOf(node, list("input", inputs[number / each]));
        number %= each;
    }
    const HPlug source = matrix.source();
    return nameOf(source.isNull() ? matrix : source) + ":" + std::to_string(number);
}

std::string traced(const HPlug& value) {
    HPlug plug = value;
    constexpr int longestChain = 100; // of collectors
    for (int step = 0; step < longestChain; ++step) {
        const HPlug source = plug.source();
        if (source.isNull())
            return nameOf(plug);
        const std::string type = nodeType(source.node());
        const bool isListed = source.isElement();
        if (isListed && (type == "matrixConverter" || type == "orthoAxisFromMatrixArray"))
            return converted(source);
        if (!isListed || type != "controlCollector" || attributeOf(source) != "output")
            return nameOf(source);
        plug = collected(source.node(), source.logicalIndex());
        if (plug.isNull())
            return nameOf(source);
    }
    return nameOf(plug);
}

} // namespace

std::vector<std::string> controlNames(const Warp& warp) {
    const HPlug values = warp.plug("controlValues");
    std::vector<std::string> names;
    std::set<std::string> taken;
    for (const unsigned index : indicesOf(values)) {
        const HPlug value = values.elementByLogicalIndex(index);
        std::string name = traced(value);
        // the same plug twice: the place tells one from the other
        if (!taken.insert(name).second)
            taken.insert(name += " at " + nameOf(value));
        names.push_back(name);
    }
    return names;
}

} // namespace quarn
