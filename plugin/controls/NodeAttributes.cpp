// SPDX-License-Identifier: Apache-2.0
#include "controls/NodeAttributes.h"

#include "openquarn/HPxNode.h"

namespace neuralWarp {

void NodeAttributes::note(const HStatus& status) {
    if (!status_.error())
        status_ = status;
}

void NodeAttributes::setFlags(const HObject& attribute, const AttributeFlags& flags) {
    HFnAttribute set(attribute);
    note(set.setArray(flags.array));
    note(set.setUsesArrayDataBuilder(flags.builder));
    note(set.setWritable(flags.writable));
    if (!flags.keyable)
        note(set.setKeyable(false));
    note(set.setDisconnectBehavior(flags.onDisconnect));
}

HObject NodeAttributes::number(const char* longName, const char* shortName, HFnNumericData::Type kind,
                               double defaultValue, const AttributeFlags& flags) {
    HStatus status;
    HObject attribute = HFnNumericAttribute().create(longName, shortName, kind, defaultValue, &status);
    note(status);
    setFlags(attribute, flags);
    return attribute;
}

HObject NodeAttributes::matrix(const char* longName, const char* shortName, const AttributeFlags& flags) {
    HStatus status;
    HObject attribute = HFnTypedAttribute().create(longName, shortName, HFnData::kMatrix, HObject::kNullObj, &status);
    note(status);
    setFlags(attribute, flags);
    return attribute;
}

HObject NodeAttributes::compound(const char* longName, const char* shortName, std::initializer_list<HObject> children,
                                 const AttributeFlags& flags) {
    HFnCompoundAttribute set;
    HStatus status;
    HObject attribute = set.create(longName, shortName, &status);
    note(status);
    setFlags(attribute, flags);
    for (const HObject& child : children)
        note(set.addChild(child));
    return attribute;
}

void NodeAttributes::add(std::initializer_list<HObject> attributes) {
    for (const HObject& attribute : attributes)
        note(HPxNode::addAttribute(attribute));
}

void NodeAttributes::affects(std::initializer_list<HObject> inputs, std::initializer_list<HObject> outputs,
                             bool affectsTree) {
    for (const HObject& input : inputs)
        for (const HObject& output : outputs)
            note(HPxNode::attributeAffects(input, output, affectsTree));
}

} // namespace neuralWarp
