// SPDX-License-Identifier: Apache-2.0
#include "host/faults/GraphRig.h"

#include "openquarn/HDGModifier.h"
#include "openquarn/HFnAttribute.h"
#include "openquarn/HFnData.h"
#include "openquarn/HFnDependencyNode.h"
#include "openquarn/HFnPlugin.h"
#include "openquarn/HMatrix.h"
#include "openquarn/HPxData.h"
#include "openquarn_app/Plugins.h"

HObject RowNode::number, RowNode::text, RowNode::matrix, RowNode::list, RowNode::group, RowNode::items, RowNode::part,
    RowNode::out;

namespace {

class RowData : public HPxData {
public:
    void copy(const HPxData&) override {}
    HTypeId typeId() const override { return rowDataId; }
    HString name() const override { return "rowData"; }
};

GraphRig* current = nullptr;

HObject makeList(const char* longName, const char* shortName) {
    HFnNumericAttribute numeric;
    HObject made = numeric.create(longName, shortName, HFnNumericData::kDouble);
    numeric.setArray(true);
    numeric.setUsesArrayDataBuilder(true);
    return made;
}

void makeAttributes() {
    HFnNumericAttribute numeric;
    RowNode::number = numeric.create("number", "n", HFnNumericData::kDouble, 1.0);
    RowNode::part = numeric.create("part", "p", HFnNumericData::kDouble);
    RowNode::out = numeric.create("out", "o", HFnNumericData::kDouble);
    numeric.setWritable(false);
    HFnTypedAttribute typed;
    RowNode::text = typed.create("text", "t", HFnData::kString);
    typed.setUsedAsFilename(true);
    RowNode::matrix = HFnMatrixAttribute().create("matrix", "m");
    RowNode::list = makeList("list", "l");
    RowNode::items = makeList("items", "i");
    HFnCompoundAttribute compound;
    RowNode::group = compound.create("group", "g");
    compound.addChild(RowNode::items);
    compound.addChild(RowNode::part);
}

HStatus initializeRowNode() {
    makeAttributes();
    for (const HObject& attribute :
         {RowNode::number, RowNode::text, RowNode::matrix, RowNode::list, RowNode::group, RowNode::out})
        if (HStatus status = HPxNode::addAttribute(attribute); status.error())
            return status;
    return HPxNode::attributeAffects(RowNode::number, RowNode::out);
}

HStatus initialize(HObject plugin) {
    current->plugin = plugin;
    HFnPlugin set(plugin);
    const HStatus status = set.registerNode(
        "rowNode", rowNodeId, []() -> HPxNode* { return new RowNode; }, initializeRowNode);
    return status.error() ? status : set.registerData("rowData", rowDataId, []() -> HPxData* { return new RowData; });
}

HStatus uninitialize(HObject plugin) {
    HFnPlugin set(plugin);
    const HStatus status = set.deregisterNode(rowNodeId);
    return status.error() ? status : set.deregisterData(rowDataId);
}

std::shared_ptr<void> makeRig() {
    return std::make_shared<GraphRig>();
}

} // namespace

GraphRig::GraphRig() {
    current = this;
    OpenQuarn::addPlugin("rows", initialize, uninitialize);
    HFnDependencyNode set;
    second = set.create(rowNodeId, "second");
    first = set.create(rowNodeId, "first");
    user = dynamic_cast<RowNode*>(set.userNode());
    textData = HFnStringData().create("words");

    HMatrix moved;
    moved.matrix[3][0] = 5.0;
    plug(RowNode::number).setDouble(2.0);
    plug(RowNode::text).setHObject(textData);
    plug(RowNode::matrix).setMatrix(moved);
    element().setDouble(4.0);
    plug(RowNode::list).elementByLogicalIndex(5).setDouble(6.0);
    plug(RowNode::items).elementByLogicalIndex(7).setDouble(8.0);
    HDGModifier modifier;
    modifier.connect(plug(RowNode::out), {second, RowNode::number});
    modifier.doIt();
}

HPlug GraphRig::element() const {
    return plug(RowNode::list).elementByLogicalIndex(3);
}

HDataHandle GraphRig::groupValue() const {
    return block().outputValue(RowNode::group);
}

HArrayDataHandle GraphRig::array() const {
    return block().outputArrayValue(RowNode::list);
}

FaultRow graphRow(const char* operation, HStatus (*call)(GraphRig& rig)) {
    return {operation, [call] { return call(*current); }, makeRig};
}

FaultRow graphRow(const char* operation, bool (*call)(GraphRig& rig, HStatus* status)) {
    const auto checked = [call]() -> HStatus {
        HStatus status(HStatus::kNotImplemented, "the status was not written");
        const bool answered = call(*current, &status);
        if (answered == status.error() && status != HStatus::kNotImplemented)
            return {HStatus::kNotImplemented, answered ? "it failed with a value" : "it succeeded without a value"};
        return status;
    };
    return {operation, checked, makeRig};
}
