// SPDX-License-Identifier: Apache-2.0
#include "openquarn/HDGModifier.h"

#include "core/apiCall.h"
#include "core/text.h"
#include "graph/Graph.h"
#include "graph/plugImpl.h"
#include "openquarn/HGlobal.h"

#include <utility>

using OpenQuarn::Access;
using OpenQuarn::apiCall;
using OpenQuarn::apiValue;
using OpenQuarn::Node;
using OpenQuarn::Operation;
using OpenQuarn::Slot;

namespace {

HStatus noNode() {
    return {HStatus::kInvalidParameter, "the object is no node, or one that has been deleted"};
}
HStatus noPlug() {
    return {HStatus::kInvalidParameter, "a plug is null"};
}

HObject createNode(const std::shared_ptr<const OpenQuarn::NodeClass>& type, const std::string& wanted,
                   HStatus& outcome) {
    if (type)
        return Access::object(OpenQuarn::currentGraph().createNode(type));
    outcome = {HStatus::kNotFound, "no node type " + wanted + " is registered"};
    return {};
}

HStatus connectNow(const HPlug& source, const HPlug& destination) {
    OpenQuarn::TentativeSlot from(source);
    OpenQuarn::TentativeSlot to(destination);
    if (!from.get() || !to.get())
        return {HStatus::kFailure, "'" + source.name().asStdString() + "' or '" + destination.name().asStdString() +
                                       "' does not name one place"};
    OpenQuarn::Graph& graph = from.get()->owner->node.graph();
    graph.connect(*from.get(), *to.get());
    for (OpenQuarn::TentativeSlot* end : {&from, &to}) {
        if (end->isNew())
            graph.notify(*end->get(), HNodeMessage::kAttributeArrayAdded);
        end->keep();
    }
    return HStatus::kSuccess;
}

HStatus disconnectNow(const HPlug& source, const HPlug& destination) {
    const std::shared_ptr<Slot> from = OpenQuarn::resolvePlug(OpenQuarn::normalContext, source);
    const std::shared_ptr<Slot> to = OpenQuarn::resolvePlug(OpenQuarn::normalContext, destination);
    if (!from || !to || to->source() != from.get())
        return {HStatus::kFailure,
                "'" + source.name().asStdString() + "' is not connected to '" + destination.name().asStdString() + "'"};
    to->owner->node.graph().disconnect(*to);
    return HStatus::kSuccess;
}

bool isLinked(const Slot& slot) {
    bool linked = slot.source() || slot.hasDestinations();
    slot.forEachPart([&](const Slot& part) { linked = linked || isLinked(part); });
    return linked;
}

HStatus removeNow(const HPlug& element, bool breakConnections) {
    const std::shared_ptr<Slot> slot = OpenQuarn::resolvePlug(OpenQuarn::normalContext, element);
    if (!slot || !slot->isElement)
        return {HStatus::kFailure, "'" + element.name().asStdString() + "' is no element that exists"};
    if (!breakConnections && isLinked(*slot))
        return {HStatus::kFailure, "'" + element.name().asStdString() + "' is connected"};
    slot->owner->node.graph().removeElement(*slot->parent, slot->index);
    return HStatus::kSuccess;
}

} // namespace

HObject HDGModifier::createNode(const HString& typeName, HStatus* status) {
    return apiValue(Operation::HDGModifier_createNode, status, HObject(), [&](HStatus& outcome) {
        return ::createNode(OpenQuarn::findNodeClass(typeName.asStdString()), "'" + typeName.asStdString() + "'",
                            outcome);
    });
}

HObject HDGModifier::createNode(const HTypeId& type, HStatus* status) {
    return apiValue(Operation::HDGModifier_createNode, status, HObject(), [&](HStatus& outcome) {
        return ::createNode(OpenQuarn::findNodeClass(type), OpenQuarn::hexText(type), outcome);
    });
}

HStatus HDGModifier::deleteNode(const HObject& node) {
    return apiCall(Operation::HDGModifier_deleteNode, [&]() -> HStatus {
        if (!Access::as<Node>(node))
            return noNode();
        changes_.emplace_back([node]() -> HStatus {
            const auto found = Access::as<Node>(node);
            if (!found)
                return noNode();
            found->graph().deleteNode(*found);
            return HStatus::kSuccess;
        });
        return HStatus::kSuccess;
    });
}

HStatus HDGModifier::renameNode(const HObject& node, const HString& name) {
    return apiCall(Operation::HDGModifier_renameNode, [&]() -> HStatus {
        if (!Access::as<Node>(node))
            return noNode();
        changes_.emplace_back([node, name]() -> HStatus {
            const auto found = Access::as<Node>(node);
            if (!found)
                return noNode();
            found->graph().renameNode(*found, name.asStdString());
            return HStatus::kSuccess;
        });
        return HStatus::kSuccess;
    });
}

HStatus HDGModifier::connect(const HPlug& source, const HPlug& destination) {
    return apiCall(Operation::HDGModifier_connect, [&]() -> HStatus {
        if (source.isNull() || destination.isNull())
            return noPlug();
        changes_.emplace_back([source, destination] { return connectNow(source, destination); });
        return HStatus::kSuccess;
    });
}

HStatus HDGModifier::disconnect(const HPlug& source, const HPlug& destination) {
    return apiCall(Operation::HDGModifier_disconnect, [&]() -> HStatus {
        if (source.isNull() || destination.isNull())
            return noPlug();
        changes_.emplace_back([source, destination] { return disconnectNow(source, destination); });
        return HStatus::kSuccess;
    });
}

HStatus HDGModifier::removeMultiInstance(const HPlug& element, bool breakConnections) {
    return apiCall(Operation::HDGModifier_removeMultiInstance, [&]() -> HStatus {
        if (!element.isElement())
            return {HStatus::kInvalidParameter, "'" + element.name().asStdString() + "' is no element of an array"};
        changes_.emplace_back([element, breakConnections] { return removeNow(element, breakConnections); });
        return HStatus::kSuccess;
    });
}

HStatus HDGModifier::newPlugValueDouble(const HPlug& plug, double value) {
    return apiCall(Operation::HDGModifier_newPlugValueDouble, [&]() -> HStatus {
        if (plug.isNull())
            return noPlug();
        changes_.emplace_back([plug = HPlug(plug), value]() mutable { return plug.setDouble(value); });
        return HStatus::kSuccess;
    });
}

HStatus HDGModifier::newPlugValueInt(const HPlug& plug, int value) {
    return apiCall(Operation::HDGModifier_newPlugValueInt, [&]() -> HStatus {
        if (plug.isNull())
            return noPlug();
        changes_.emplace_back([plug = HPlug(plug), value]() mutable { return plug.setInt(value); });
        return HStatus::kSuccess;
    });
}

HStatus HDGModifier::newPlugValueString(const HPlug& plug, const HString& value) {
    return apiCall(Operation::HDGModifier_newPlugValueString, [&]() -> HStatus {
        if (plug.isNull())
            return noPlug();
        changes_.emplace_back([plug = HPlug(plug), value]() mutable { return plug.setString(value); });
        return HStatus::kSuccess;
    });
}

HStatus HDGModifier::newPlugValue(const HPlug& plug, const HObject& data) {
    return apiCall(Operation::HDGModifier_newPlugValue, [&]() -> HStatus {
        if (plug.isNull())
            return noPlug();
        changes_.emplace_back([plug = HPlug(plug), data]() mutable { return plug.setHObject(data); });
        return HStatus::kSuccess;
    });
}

HStatus HDGModifier::commandToExecute(const HString& command) {
    return apiCall(Operation::HDGModifier_commandToExecute, [&]() -> HStatus {
        if (command.isEmpty())
            return {HStatus::kInvalidParameter, "the command is empty"};
        changes_.emplace_back([command] { return HGlobal::executeCommand(command); });
        return HStatus::kSuccess;
    });
}

HStatus HDGModifier::doIt() {
    return apiCall(Operation::HDGModifier_doIt, [&]() -> HStatus {
        std::size_t made = 0;
        HStatus status;
        for (; made < changes_.size(); ++made) {
            try {
                status = changes_[made]();
            } catch (...) {
                status = OpenQuarn::statusOfException("HDGModifier::doIt");
            }
            if (status.error())
                break;
        }
        changes_.erase(changes_.begin(), changes_.begin() + static_cast<std::ptrdiff_t>(made));
        return status;
    });
}
