// SPDX-License-Identifier: Apache-2.0
#include "quarn/scene/controlSource.h"

#include "quarn/scene/plugs.h"

#include <string>
#include <vector>

namespace quarn {
namespace {

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

ControlSource ofMatrix(const HObject& converter, unsigned input, unsigned number) {
    const HPlug matrix = plugOf(converter, list("input", input));
    const HPlug source = matrix.source();
    return {source.isNull() ? matrix : source, converter, number};
}

// the matrix behind a number of a converter, and which of its numbers that is
ControlSource converted(const HPlug& output) {
    const HObject node = output.node();
    const unsigned number = output.logicalIndex();
    if (attributeOf(output) == "outputList")
        return ofMatrix(node, output.array().parent().logicalIndex(), number);
    const std::vector<unsigned> inputs = indicesOf(plugOf(node, "input"));
    const std::size_t numbers = indicesOf(output.array()).size();
    const auto each = static_cast<unsigned>(inputs.empty() ? 0 : numbers / inputs.size());
    if (each == 0 || number / each >= inputs.size())
        return {output, {}, 0};
    return ofMatrix(node, inputs[number / each], number % each);
}

} // namespace

ControlSource controlSource(const HPlug& value) {
    HPlug plug = value;
    constexpr int longestChain = 100; // of collectors
    for (int step = 0; step < longestChain; ++step) {
        const HPlug source = plug.source();
        if (source.isNull())
            return {plug, {}, 0};
        const std::string type = nodeType(source.node());
        const bool isListed = source.isElement();
        if (isListed && (type == converterType || type == axesType))
            return converted(source);
        if (!isListed || type != "controlCollector" || attributeOf(source) != "output")
            return {source, {}, 0};
        plug = collected(source.node(), source.logicalIndex());
        if (plug.isNull())
            return {source, {}, 0};
    }
    return {plug, {}, 0};
}

} // namespace quarn
