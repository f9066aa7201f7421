// SPDX-License-Identifier: Apache-2.0
#include "host/faults/GraphRig.h"

#include "openquarn/HFnAttribute.h"
#include "openquarn/HFnPlugin.h"
#include "openquarn/HNodeClass.h"

namespace {

HFnNumericAttribute numeric() {
    HFnNumericAttribute made;
    made.create("made", "md", HFnNumericData::kDouble);
    return made;
}

HFnNumericAttribute limited() {
    HFnNumericAttribute made = numeric();
    made.setMin(1.0);
    made.setMax(2.0);
    made.setSoftMin(3.0);
    made.setSoftMax(4.0);
    return made;
}

HFnEnumAttribute enumeration() {
    HFnEnumAttribute made;
    made.create("made", "md");
    return made;
}

HFnEnumAttribute labelled() {
    HFnEnumAttribute made = enumeration();
    made.addField("five", 5);
    return made;
}

HFnCompoundAttribute compound() {
    HFnCompoundAttribute made;
    made.create("made", "md");
    return made;
}

HFnCompoundAttribute parent() {
    HFnCompoundAttribute made = compound();
    made.addChild(numeric().object());
    return made;
}

template <HStatus (HFnAttribute::*set)(bool)>
HStatus setFlag(GraphRig&) {
    return (numeric().*set)(true);
}

template <HStatus (HFnNumericAttribute::*set)(double)>
HStatus setNumber(GraphRig&) {
    return (numeric().*set)(3.0);
}

template <double (HFnNumericAttribute::*get)(HStatus*) const>
bool getNumber(GraphRig&, HStatus* status) {
    return (limited().*get)(status) > 0.0;
}

/// A creation that takes names and a status only.
template <class Set>
bool create(GraphRig&, HStatus* status) {
    Set set;
    return !set.create("made", "md", status).isNull() && !set.object().isNull();
}

// what the initializer of a type that is registered and deregistered again answers
HStatus initializing(GraphRig& rig, HStatus (*initializer)()) {
    static HStatus (*call)() = nullptr;
    static HStatus answer;
    call = initializer;
    HFnPlugin set(rig.plugin);
    const HStatus registered = set.registerNode(
        "rowOther", 0x7103, []() -> HPxNode* { return new RowNode; }, [] { return answer = call(); });
    const HStatus deregistered = answer.error() ? HStatus() : set.deregisterNode(0x7103);
    return answer.error() ? answer : registered.error() ? registered : deregistered;
}

std::vector<FaultRow> creationRows() {
    return {
        graphRow("HFnCompoundAttribute::create", create<HFnCompoundAttribute>),
        graphRow("HFnMatrixAttribute::create", create<HFnMatrixAttribute>),
        graphRow("HFnMessageAttribute::create", create<HFnMessageAttribute>),
        graphRow(
            "HFnEnumAttribute::create",
            [](GraphRig&, HStatus* status) { return !HFnEnumAttribute().create("made", "md", 1, status).isNull(); }),
        graphRow("HFnNumericAttribute::create",
                 [](GraphRig&, HStatus* status) {
                     return !HFnNumericAttribute().create("made", "md", HFnNumericData::kInt, 1.0, status).isNull();
                 }),
        graphRow("HFnTypedAttribute::create",
                 [](GraphRig& rig, HStatus* status) {
                     return !HFnTypedAttribute().create("made", "md", HFnData::kString, rig.textData, status).isNull();
                 }),
        graphRow(
            "HPxNode::addAttribute",
            [](GraphRig& rig) { return initializing(rig, [] { return HPxNode::addAttribute(numeric().object()); }); }),
        graphRow("HPxNode::attributeAffects",
                 [](GraphRig& rig) {
                     return initializing(rig, [] {
                         const HObject from = numeric().object();
                         const HObject to = HFnMatrixAttribute().create("other", "ot");
                         HPxNode::addAttribute(from);
                         HPxNode::addAttribute(to);
                         return HPxNode::attributeAffects(from, to);
                     });
                 }),
    };
}

} // namespace

std::vector<FaultRow> attributeRows() {
    std::vector<FaultRow> rows = creationRows();
    const std::vector<FaultRow> others = {
        graphRow("HFnAttribute::setArray", setFlag<&HFnAttribute::setArray>),
        graphRow("HFnAttribute::setConnectable", setFlag<&HFnAttribute::setConnectable>),
        graphRow("HFnAttribute::setHidden", setFlag<&HFnAttribute::setHidden>),
        graphRow("HFnAttribute::setIndexMatters", setFlag<&HFnAttribute::setIndexMatters>),
        graphRow("HFnAttribute::setKeyable", setFlag<&HFnAttribute::setKeyable>),
        graphRow("HFnAttribute::setReadable", setFlag<&HFnAttribute::setReadable>),
        graphRow("HFnAttribute::setStorable", setFlag<&HFnAttribute::setStorable>),
        graphRow("HFnAttribute::setUsedAsFilename", setFlag<&HFnAttribute::setUsedAsFilename>),
        graphRow("HFnAttribute::setUsesArrayDataBuilder", setFlag<&HFnAttribute::setUsesArrayDataBuilder>),
        graphRow("HFnAttribute::setWritable", setFlag<&HFnAttribute::setWritable>),
        graphRow("HFnAttribute::setDisconnectBehavior",
                 [](GraphRig&) { return numeric().setDisconnectBehavior(HFnAttribute::kReset); }),
        graphRow("HFnNumericAttribute::setDefault", setNumber<&HFnNumericAttribute::setDefault>),
        graphRow("HFnNumericAttribute::setMin", setNumber<&HFnNumericAttribute::setMin>),
        graphRow("HFnNumericAttribute::setMax", setNumber<&HFnNumericAttribute::setMax>),
        graphRow("HFnNumericAttribute::setSoftMin", setNumber<&HFnNumericAttribute::setSoftMin>),
        graphRow("HFnNumericAttribute::setSoftMax", setNumber<&HFnNumericAttribute::setSoftMax>),
        graphRow("HFnNumericAttribute::getMin", getNumber<&HFnNumericAttribute::getMin>),
        graphRow("HFnNumericAttribute::getMax", getNumber<&HFnNumericAttribute::getMax>),
        graphRow("HFnNumericAttribute::getSoftMin", getNumber<&HFnNumericAttribute::getSoftMin>),
        graphRow("HFnNumericAttribute::getSoftMax", getNumber<&HFnNumericAttribute::getSoftMax>),
        graphRow("HFnEnumAttribute::addField", [](GraphRig&) { return enumeration().addField("six", 6); }),
        graphRow("HFnEnumAttribute::setDefault", [](GraphRig&) { return enumeration().setDefault(5); }),
        graphRow("HFnEnumAttribute::fieldName",
                 [](GraphRig&, HStatus* status) { return labelled().fieldName(5, status) == "five"; }),
        graphRow("HFnEnumAttribute::fieldIndex",
                 [](GraphRig&, HStatus* status) { return labelled().fieldIndex("five", status) == 5; }),
        graphRow("HFnCompoundAttribute::addChild", [](GraphRig&) { return compound().addChild(numeric().object()); }),
        graphRow("HFnCompoundAttribute::child",
                 [](GraphRig&, HStatus* status) { return !parent().child(0, status).isNull(); }),
        graphRow("HNodeClass::attribute",
                 [](GraphRig&, HStatus* status) {
                     return HNodeClass("rowNode").attribute("number", status) == RowNode::number;
                 }),
    };
    rows.insert(rows.end(), others.begin(), others.end());
    return rows;
}
