// SPDX-License-Identifier: Apache-2.0
#include "host/faults/GraphRig.h"

#include "openquarn/HDGModifier.h"
#include "openquarn/HExternalContentInfoTable.h"
#include "openquarn/HExternalContentLocationTable.h"
#include "openquarn/HFnDependencyNode.h"
#include "openquarn/HNodeMessage.h"
#include "openquarn/HSelectionList.h"

namespace {

void ignoreChange(int, HPlug&, HPlug&, void*) {}

HCallbackId watch(const GraphRig& rig, HStatus* status = nullptr) {
    return HNodeMessage::addAttributeChangedCallback(rig.first, ignoreChange, nullptr, status);
}

HSelectionList selectedPlug(const GraphRig& rig) {
    HSelectionList list;
    list.add(rig.plug(RowNode::number));
    return list;
}

std::vector<FaultRow> modifierRows() {
    return {
        graphRow("HDGModifier::commandToExecute", [](GraphRig&) { return HDGModifier().commandToExecute("ls"); }),
        graphRow("HDGModifier::connect",
                 [](GraphRig& rig) { return HDGModifier().connect(rig.plug(RowNode::out), rig.plug(RowNode::part)); }),
        graphRow("HDGModifier::disconnect",
                 [](GraphRig& rig) {
                     return HDGModifier().disconnect(rig.plug(RowNode::out), {rig.second, RowNode::number});
                 }),
        graphRow("HDGModifier::createNode",
                 [](GraphRig&, HStatus* status) { return !HDGModifier().createNode("rowNode", status).isNull(); }),
        graphRow("HDGModifier::deleteNode", [](GraphRig& rig) { return HDGModifier().deleteNode(rig.first); }),
        graphRow("HDGModifier::renameNode", [](GraphRig& rig) { return HDGModifier().renameNode(rig.first, "new"); }),
        graphRow("HDGModifier::doIt",
                 [](GraphRig& rig) {
                     HDGModifier modifier;
                     modifier.renameNode(rig.first, "renamed");
                     return modifier.doIt();
                 }),
        graphRow("HDGModifier::newPlugValue",
                 [](GraphRig& rig) { return HDGModifier().newPlugValue(rig.plug(RowNode::text), rig.textData); }),
        graphRow("HDGModifier::newPlugValueDouble",
                 [](GraphRig& rig) { return HDGModifier().newPlugValueDouble(rig.plug(RowNode::number), 3.0); }),
        graphRow("HDGModifier::newPlugValueInt",
                 [](GraphRig& rig) { return HDGModifier().newPlugValueInt(rig.plug(RowNode::number), 3); }),
        graphRow("HDGModifier::newPlugValueString",
                 [](GraphRig& rig) { return HDGModifier().newPlugValueString(rig.plug(RowNode::text), "new"); }),
        graphRow("HDGModifier::removeMultiInstance",
                 [](GraphRig& rig) { return HDGModifier().removeMultiInstance(rig.element(), true); }),
    };
}

} // namespace

std::vector<FaultRow> nodeRows() {
    std::vector<FaultRow> rows = {
        graphRow("HFnBase::setObject", [](GraphRig& rig) { return HFnDependencyNode().setObject(rig.first); }),
        graphRow("HFnDependencyNode::attribute",
                 [](GraphRig& rig, HStatus* status) {
                     return HFnDependencyNode(rig.first).attribute("number", status) == RowNode::number;
                 }),
        graphRow(
            "HFnDependencyNode::create",
            [](GraphRig&, HStatus* status) { return !HFnDependencyNode().create("rowNode", "made", status).isNull(); }),
        graphRow("HFnDependencyNode::findPlug",
                 [](GraphRig& rig, HStatus* status) {
                     return !HFnDependencyNode(rig.first).findPlug("number", status).isNull();
                 }),
        graphRow("HFnDependencyNode::getConnections",
                 [](GraphRig& rig) {
                     HPlugArray plugs;
                     return HFnDependencyNode(rig.first).getConnections(plugs);
                 }),
        graphRow("HFnDependencyNode::setName",
                 [](GraphRig& rig) { return HFnDependencyNode(rig.first).setName("renamed"); }),
        graphRow(
            "HFnDependencyNode::userNode",
            [](GraphRig& rig, HStatus* status) { return HFnDependencyNode(rig.first).userNode(status) == rig.user; }),
        graphRow("HMessage::removeCallback", [](GraphRig& rig) { return HMessage::removeCallback(watch(rig)); }),
        graphRow("HNodeMessage::addAttributeChangedCallback",
                 [](GraphRig& rig, HStatus* status) { return watch(rig, status) != 0; }),
        graphRow("HPxNode::addExternalContentForFileAttr",
                 [](GraphRig& rig) {
                     HExternalContentInfoTable table;
                     return rig.user->addFile(table);
                 }),
        graphRow("HPxNode::setExternalContentForFileAttr",
                 [](GraphRig& rig) {
                     HExternalContentLocationTable table;
                     table.addEntry("text", "elsewhere");
                     return rig.user->setFile(table);
                 }),
        graphRow("HSelectionList::add", [](GraphRig&) { return HSelectionList().add("time1.outTime"); }),
        graphRow("HSelectionList::getDependNode",
                 [](GraphRig& rig) {
                     HObject node;
                     return selectedPlug(rig).getDependNode(0, node);
                 }),
        graphRow("HSelectionList::getPlug",
                 [](GraphRig& rig) {
                     HPlug plug;
                     return selectedPlug(rig).getPlug(0, plug);
                 }),
    };
    const std::vector<FaultRow> modifier = modifierRows();
    rows.insert(rows.end(), modifier.begin(), modifier.end());
    return rows;
}
