// SPDX-License-Identifier: Apache-2.0
#include "quarn/scene/plugs.h"

#include "openquarn/HDGModifier.h"
#include "openquarn/HFnData.h"
#include "openquarn/HFnDependencyNode.h"
#include "openquarn/HMatrix.h"
#include "openquarn/HSelectionList.h"
#include "openquarn_app/Commands.h"
#include "openquarn_app/Evaluation.h"

#include <cctype>
#include <stdexcept>

namespace quarn {
namespace {

void require(const HStatus& status, const std::string& what) {
    if (status.error())
        throw std::runtime_error(what + ": " + status.errorString().asChar());
}

void requireSet(const HStatus& status, const HPlug& plug) {
    require(status, std::string(plug.name().asChar()) + " could not be set");
}

void requireRead(const HStatus& status, const HPlug& plug) {
    require(status, std::string(plug.name().asChar()) + " could not be evaluated");
}

} // namespace

std::string usableName(std::string name) {
    for (char& letter : name)
        if (std::isalnum(static_cast<unsigned char>(letter)) == 0 && letter != '_')
            letter = '_';
    if (name.empty() || std::isdigit(static_cast<unsigned char>(name.front())) != 0)
        name.insert(0, "_");
    return name;
}

HObject createNode(const std::string& type, const std::string& name) {
    HStatus status;
    HObject node = HFnDependencyNode().create(type.c_str(), usableName(name).c_str(), &status);
    require(status, "a node of type " + type + " could not be made");
    return node;
}

std::string nodeName(const HObject& node) {
    return HFnDependencyNode(node).name().asChar();
}

std::string nodeType(const HObject& node) {
    return HFnDependencyNode(node).typeName().asChar();
}

HObject findNode(const std::string& name) {
    HSelectionList list;
    HObject node;
    require(list.add(name.c_str()), "there is no node " + name);
    require(list.getDependNode(0, node), "there is no node " + name);
    return node;
}

std::vector<HObject> nodesOfType(const std::string& type) {
    std::vector<HObject> found;
    const OpenQuarn::CommandOutcome names = OpenQuarn::runCommand("ls -type " + OpenQuarn::quotedWord(type));
    if (const auto* list = std::get_if<std::vector<std::string>>(&names.result))
        for (const std::string& name : *list)
            found.push_back(findNode(name));
    return found;
}

HPlug findPlug(const std::string& name) {
    HSelectionList list;
    HPlug plug;
    require(list.add(name.c_str()), "there is no plug " + name);
    require(list.getPlug(0, plug), "there is no plug " + name);
    return plug;
}

HPlug plugOf(const HObject& node, const std::string& path) {
    return findPlug(nodeName(node) + "." + path);
}

void connect(const HPlug& source, const HPlug& destination) {
    HDGModifier change;
    require(change.connect(source, destination), "connecting");
    require(change.doIt(),
            std::string(source.name().asChar()) + " could not be connected into " + destination.name().asChar());
}

void disconnectSource(const HPlug& destination) {
    const HPlug source = destination.source();
    if (source.isNull())
        return;
    HDGModifier change;
    require(change.disconnect(source, destination), "disconnecting");
    require(change.doIt(), std::string(destination.name().asChar()) + " could not be disconnected");
}

HPlug sourceOf(const HObject& node, const std::string& path) {
    return plugOf(node, path).source();
}

void setNumber(const HPlug& plug, double value) {
    HPlug target = plug;
    requireSet(target.setDouble(value), plug);
}

void setText(const HPlug& plug, const std::string& text) {
    HPlug target = plug;
    requireSet(target.setString(text.c_str()), plug);
}

void setMatrix(const HPlug& plug, const HMatrix& matrix) {
    HPlug target = plug;
    requireSet(target.setMatrix(matrix), plug);
}

void setList(const HPlug& plug, const std::vector<double>& values) {
    HPlug target = plug;
    requireSet(target.setHObject(HFnDoubleArrayData().create(values)), plug);
}

double numberOf(const HPlug& plug) {
    HStatus status;
    const double value = plug.asDouble(&status);
    requireRead(status, plug);
    return value;
}

HMatrix matrixOf(const HPlug& plug) {
    HStatus status;
    const HMatrix value = plug.asMatrix(&status);
    requireRead(status, plug);
    return value;
}

int wholeNumberOf(const HPlug& plug) {
    HStatus status;
    const int value = plug.asInt(&status);
    requireRead(status, plug);
    return value;
}

std::string textOf(const HPlug& plug) {
    HStatus status;
    const HString value = plug.asString(&status);
    requireRead(status, plug);
    return value.asChar();
}

std::vector<unsigned> indicesOf(const HPlug& array) {
    std::vector<unsigned> indices;
    requireRead(array.getExistingArrayAttributeIndices(indices), array);
    return indices;
}

std::vector<double> numbersOf(const HPlug& array) {
    // which elements there are is known only afterwards
    requireRead(OpenQuarn::evaluate(array), array);
    std::vector<double> values;
    const std::vector<unsigned> indices = indicesOf(array);
    values.reserve(indices.size());
    for (const unsigned index : indices)
        values.push_back(numberOf(array.elementByLogicalIndex(index)));
    return values;
}

} // namespace quarn
