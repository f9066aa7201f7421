// SPDX-License-Identifier: Apache-2.0
#include "host/faults/GraphRig.h"

#include "openquarn/HMatrix.h"

namespace {

std::vector<FaultRow> readingRows() {
    return {
        graphRow("HPlug::asBool",
                 [](GraphRig& rig, HStatus* status) { return rig.plug(RowNode::number).asBool(status); }),
        graphRow("HPlug::asShort",
                 [](GraphRig& rig, HStatus* status) { return rig.plug(RowNode::number).asShort(status) == 2; }),
        graphRow("HPlug::asInt",
                 [](GraphRig& rig, HStatus* status) { return rig.plug(RowNode::number).asInt(status) == 2; }),
        graphRow("HPlug::asFloat",
                 [](GraphRig& rig, HStatus* status) { return rig.plug(RowNode::number).asFloat(status) == 2.0F; }),
        graphRow("HPlug::asDouble",
                 [](GraphRig& rig, HStatus* status) { return rig.plug(RowNode::number).asDouble(status) == 2.0; }),
        graphRow("HPlug::asString",
                 [](GraphRig& rig, HStatus* status) { return rig.plug(RowNode::text).asString(status) == "words"; }),
        graphRow("HPlug::asMatrix",
                 [](GraphRig& rig, HStatus* status) {
                     return rig.plug(RowNode::matrix).asMatrix(status).matrix[3][0] == 5.0;
                 }),
        graphRow(
            "HPlug::asHObject",
            [](GraphRig& rig, HStatus* status) { return rig.plug(RowNode::text).asHObject(status) == rig.textData; }),
        graphRow(
            "HPlug::asHDataHandle",
            [](GraphRig& rig, HStatus* status) { return rig.plug(RowNode::number).asHDataHandle(status).isValid(); }),
        graphRow("HPlug::destructHandle",
                 [](GraphRig& rig) {
                     HDataHandle handle = rig.plug(RowNode::number).asHDataHandle();
                     return rig.plug(RowNode::number).destructHandle(handle);
                 }),
    };
}

std::vector<FaultRow> settingRows() {
    return {
        graphRow("HPlug::setBool", [](GraphRig& rig) { return rig.plug(RowNode::number).setBool(true); }),
        graphRow("HPlug::setShort", [](GraphRig& rig) { return rig.plug(RowNode::number).setShort(3); }),
        graphRow("HPlug::setInt", [](GraphRig& rig) { return rig.plug(RowNode::number).setInt(3); }),
        graphRow("HPlug::setFloat", [](GraphRig& rig) { return rig.plug(RowNode::number).setFloat(3.0F); }),
        graphRow("HPlug::setDouble", [](GraphRig& rig) { return rig.plug(RowNode::number).setDouble(3.0); }),
        graphRow("HPlug::setString", [](GraphRig& rig) { return rig.plug(RowNode::text).setString("new"); }),
        graphRow("HPlug::setMatrix", [](GraphRig& rig) { return rig.plug(RowNode::matrix).setMatrix(HMatrix()); }),
        graphRow("HPlug::setHObject", [](GraphRig& rig) { return rig.plug(RowNode::text).setHObject(rig.textData); }),
        graphRow("HPlug::setLocked", [](GraphRig& rig) { return rig.plug(RowNode::text).setLocked(true); }),
    };
}

std::vector<FaultRow> connectionRows() {
    return {
        graphRow("HPlug::source",
                 [](GraphRig& rig, HStatus* status) {
                     return HPlug(rig.second, RowNode::number).source(status) == rig.plug(RowNode::out);
                 }),
        graphRow("HPlug::destinations",
                 [](GraphRig& rig) {
                     HPlugArray plugs;
                     return rig.plug(RowNode::out).destinations(plugs);
                 }),
    };
}

} // namespace

std::vector<FaultRow> plugRows() {
    std::vector<FaultRow> rows = {
        graphRow("HPlug::array",
                 [](GraphRig& rig, HStatus* status) { return rig.element().array(status) == rig.plug(RowNode::list); }),
        graphRow("HPlug::child",
                 [](GraphRig& rig, HStatus* status) {
                     return rig.plug(RowNode::group).child(RowNode::part, status) == RowNode::part;
                 }),
        graphRow(
            "HPlug::parent",
            [](GraphRig& rig, HStatus* status) { return rig.plug(RowNode::part).parent(status) == RowNode::group; }),
        graphRow("HPlug::elementByLogicalIndex",
                 [](GraphRig& rig, HStatus* status) {
                     return rig.plug(RowNode::list).elementByLogicalIndex(5, status).isElement();
                 }),
        graphRow("HPlug::elementByPhysicalIndex",
                 [](GraphRig& rig, HStatus* status) {
                     return rig.plug(RowNode::list).elementByPhysicalIndex(1, status).isElement();
                 }),
        graphRow("HPlug::getExistingArrayAttributeIndices",
                 [](GraphRig& rig) {
                     std::vector<unsigned> indices;
                     return rig.plug(RowNode::list).getExistingArrayAttributeIndices(indices);
                 }),
        graphRow("HPlug::logicalIndex",
                 [](GraphRig& rig, HStatus* status) { return rig.element().logicalIndex(status) == 3; }),
        graphRow("HPlug::numChildren",
                 [](GraphRig& rig, HStatus* status) { return rig.plug(RowNode::group).numChildren(status) == 2; }),
        graphRow("HPlug::numElements",
                 [](GraphRig& rig, HStatus* status) { return rig.plug(RowNode::list).numElements(status) == 2; }),
        graphRow("HPlug::selectAncestorLogicalIndex",
                 [](GraphRig& rig) { return rig.plug(RowNode::list).selectAncestorLogicalIndex(3); }),
    };
    for (const auto& part : {readingRows(), settingRows(), connectionRows()})
        rows.insert(rows.end(), part.begin(), part.end());
    return rows;
}
