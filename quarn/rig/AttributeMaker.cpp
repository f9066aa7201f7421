// SPDX-License-Identifier: Apache-2.0
#include "rig/AttributeMaker.h"

#include "openquarn/HPxNode.h"

namespace rig {

void AttributeMaker::note(const HStatus& status) {
    if (!status_.error())
        status_ = status;
}

void AttributeMaker::setRole(const HObject& attribute, Role role) {
    HFnAttribute set(attribute);
    if (role == Role::output) {
        note(set.setWritable(false));
        note(set.setStorable(false));
    }
}

HObject AttributeMaker::number(const char* longName, const char* shortName, double defaultValue, Role role) {
    HStatus status;
    HFnNumericAttribute set;
    HObject attribute = set.create(longName, shortName, HFnNumericData::kDouble, defaultValue, &status);
    note(status);
    if (role == Role::output)
        note(set.setKeyable(false));
    setRole(attribute, role);
    return attribute;
}

HObject AttributeMaker::boolean(const char* longName, const char* shortName, bool defaultValue) {
    HStatus status;
    HObject attribute =
        HFnNumericAttribute().create(longName, shortName, HFnNumericData::kBoolean, defaultValue ? 1.0 : 0.0, &status);
    note(status);
    return attribute;
}

HObject AttributeMaker::choice(const char* longName, const char* shortName, std::initializer_list<const char*> labels,
                               short defaultValue) {
    HStatus status;
    HFnEnumAttribute set;
    HObject attribute = set.create(longName, shortName, defaultValue, &status);
    note(status);
    short value = 0;
    for (const char* label : labels)
        note(set.addField(label, value++));
    return attribute;
}

HObject AttributeMaker::rotationOrder(const char* longName, const char* shortName) {
    return choice(longName, shortName, {"xyz", "yzx", "zxy", "xzy", "yxz", "zyx"});
}

HObject AttributeMaker::matrix(const char* longName, const char* shortName, Role role) {
    HStatus status;
    HObject attribute = HFnMatrixAttribute().create(longName, shortName, &status);
    note(status);
    setRole(attribute, role);
    return attribute;
}

HObject AttributeMaker::data(const char* longName, const char* shortName, HFnData::Type kind) {
    HStatus status;
    HObject attribute = HFnTypedAttribute().create(longName, shortName, kind, HObject::kNullObj, &status);
    note(status);
    return attribute;
}

HObject AttributeMaker::compound(const char* longName, const char* shortName, std::initializer_list<HObject> children,
                                 Role role) {
    HStatus status;
    HFnCompoundAttribute set;
    HObject attribute = set.create(longName, shortName, &status);
    note(status);
    setRole(attribute, role);
    for (const HObject& child : children)
        note(set.addChild(child));
    return attribute;
}

void AttributeMaker::makeArray(const HObject& attribute) {
    note(HFnAttribute(attribute).setArray(true));
}

void AttributeMaker::add(std::initializer_list<HObject> attributes) {
    for (const HObject& attribute : attributes)
        note(HPxNode::addAttribute(attribute));
}

void AttributeMaker::affects(std::initializer_list<HObject> inputs, std::initializer_list<HObject> outputs) {
    for (const HObject& input : inputs)
        for (const HObject& output : outputs)
            note(HPxNode::attributeAffects(input, output, true));
}

} // namespace rig
