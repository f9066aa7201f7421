// SPDX-License-Identifier: Apache-2.0
#include "host/faults/GraphRig.h"

#include "openquarn/HFnData.h"
#include "openquarn/HMatrix.h"

namespace {

std::vector<FaultRow> dataObjectRows() {
    return {
        graphRow("HFnDoubleArrayData::create",
                 [](GraphRig&, HStatus* status) {
                     return !HFnDoubleArrayData().create(std::vector<double>{1.0}, status).isNull();
                 }),
        graphRow("HFnMatrixData::create",
                 [](GraphRig&, HStatus* status) { return !HFnMatrixData().create(HMatrix(), status).isNull(); }),
        graphRow("HFnPluginData::create",
                 [](GraphRig&, HStatus* status) { return !HFnPluginData().create(rowDataId, status).isNull(); }),
        graphRow("HFnStringData::create",
                 [](GraphRig&, HStatus* status) { return !HFnStringData().create("words", status).isNull(); }),
    };
}

std::vector<FaultRow> blockRows() {
    return {
        graphRow("HDataBlock::inputArrayValue",
                 [](GraphRig& rig, HStatus* status) {
                     return rig.block().inputArrayValue(RowNode::list, status).isValid();
                 }),
        graphRow(
            "HDataBlock::inputValue",
            [](GraphRig& rig, HStatus* status) { return rig.block().inputValue(RowNode::number, status).isValid(); }),
        graphRow("HDataBlock::outputArrayValue",
                 [](GraphRig& rig, HStatus* status) {
                     return rig.block().outputArrayValue(RowNode::list, status).isValid();
                 }),
        graphRow(
            "HDataBlock::outputValue",
            [](GraphRig& rig, HStatus* status) { return rig.block().outputValue(RowNode::out, status).isValid(); }),
        graphRow("HDataBlock::setClean", [](GraphRig& rig) { return rig.block().setClean(RowNode::out); }),
        graphRow("HDataHandle::childArray",
                 [](GraphRig& rig, HStatus* status) {
                     return rig.groupValue().childArray(RowNode::items, status).isValid();
                 }),
        graphRow("HDataHandle::copy",
                 [](GraphRig& rig) {
                     return rig.block().outputValue(RowNode::out).copy(rig.block().outputValue(RowNode::number));
                 }),
        graphRow("HDataHandle::set", [](GraphRig& rig) { return rig.block().outputValue(RowNode::out).set(3.0); }),
    };
}

} // namespace

std::vector<FaultRow> dataRows() {
    std::vector<FaultRow> rows = {
        graphRow("HArrayDataBuilder::addElement",
                 [](GraphRig& rig, HStatus* status) { return rig.array().builder().addElement(9, status).isValid(); }),
        graphRow("HArrayDataBuilder::removeElement",
                 [](GraphRig& rig) { return rig.array().builder().removeElement(5); }),
        graphRow("HArrayDataHandle::HArrayDataHandle",
                 [](GraphRig& rig, HStatus* status) {
                     return HArrayDataHandle(rig.groupValue().child(RowNode::items), status).isValid();
                 }),
        graphRow("HArrayDataHandle::builder",
                 [](GraphRig& rig, HStatus* status) { return rig.array().builder(status).elementCount() == 2; }),
        graphRow("HArrayDataHandle::elementIndex",
                 [](GraphRig& rig, HStatus* status) { return rig.array().elementIndex(status) == 3; }),
        graphRow("HArrayDataHandle::inputValue",
                 [](GraphRig& rig, HStatus* status) { return rig.array().inputValue(status).isValid(); }),
        graphRow("HArrayDataHandle::outputValue",
                 [](GraphRig& rig, HStatus* status) { return rig.array().outputValue(status).isValid(); }),
        graphRow("HArrayDataHandle::jumpToArrayElement",
                 [](GraphRig& rig) { return rig.array().jumpToArrayElement(5); }),
        graphRow("HArrayDataHandle::jumpToElement", [](GraphRig& rig) { return rig.array().jumpToElement(5); }),
        graphRow("HArrayDataHandle::jumpToPosition", [](GraphRig& rig) { return rig.array().jumpToPosition(1); }),
        graphRow("HArrayDataHandle::next", [](GraphRig& rig) { return rig.array().next(); }),
        graphRow("HArrayDataHandle::set",
                 [](GraphRig& rig) {
                     HArrayDataHandle array = rig.array();
                     HArrayDataBuilder builder = array.builder();
                     return array.set(builder);
                 }),
        graphRow("HArrayDataHandle::setAllClean", [](GraphRig& rig) { return rig.array().setAllClean(); }),
        graphRow("HArrayDataHandle::setClean", [](GraphRig& rig) { return rig.array().setClean(); }),
    };
    for (const auto& part : {dataObjectRows(), blockRows()})
        rows.insert(rows.end(), part.begin(), part.end());
    return rows;
}
