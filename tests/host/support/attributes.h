// SPDX-License-Identifier: Apache-2.0
// Attributes of node types for tests, in one call each. Needs no test framework.
#pragma once

#include "openquarn/HFnAttribute.h"
#include "openquarn/HFnPlugin.h"
#include "openquarn/HPxNode.h"
#include "openquarn_app/Plugins.h"

#include <vector>

namespace testAttributes {

inline HObject number(const char* name, HFnNumericData::Type kind, double value = 0.0) {
    return HFnNumericAttribute().create(name, name, kind, value);
}
inline HObject real(const char* name, double value = 0.0) {
    return number(name, HFnNumericData::kDouble, value);
}
inline HObject output(const HObject& attribute) {
    HFnAttribute(attribute).setWritable(false);
    return attribute;
}
inline HObject arrayOf(const HObject& attribute, bool usesBuilder = false) {
    HFnAttribute set(attribute);
    set.setArray(true);
    set.setUsesArrayDataBuilder(usesBuilder);
    return attribute;
}
inline HObject compound(const char* name, const std::vector<HObject>& children) {
    HFnCompoundAttribute set;
    HObject made = set.create(name, name);
    for (const HObject& child : children)
        set.addChild(child);
    return made;
}

template <class Node>
HPxNode* newNode() {
    return new Node;
}

/// Registers one node type, by a plug-in of its name, with the session that is open; unregisters it when that goes.
template <class Node, auto initialize, unsigned id, HPxNode::Type kind = HPxNode::kDependNode>
void addType(const char* name) {
    static const char* typeName = nullptr;
    typeName = name;
    OpenQuarn::addPlugin(
        name,
        [](HObject plugin) { return HFnPlugin(plugin).registerNode(typeName, id, newNode<Node>, initialize, kind); },
        [](HObject plugin) { return HFnPlugin(plugin).deregisterNode(id); });
}

} // namespace testAttributes
