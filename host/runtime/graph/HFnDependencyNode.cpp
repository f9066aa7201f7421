// SPDX-License-Identifier: Apache-2.0
#include "openquarn/HFnDependencyNode.h"

#include "core/apiCall.h"
#include "core/text.h"
#include "graph/Graph.h"
#include "graph/plugImpl.h"
#include "openquarn/HNodeClass.h"

using OpenQuarn::Access;
using OpenQuarn::apiCall;
using OpenQuarn::apiValue;
using OpenQuarn::Node;
using OpenQuarn::NodeClass;
using OpenQuarn::Operation;

namespace {

std::shared_ptr<Node> attached(const HObject& object) {
    return Access::as<Node>(object);
}

HStatus nothingAttached() {
    return {HStatus::kInvalidParameter, "no node is attached to the function set"};
}

HObject attributeObject(const OpenQuarn::Field& field) {
    return Access::object(std::const_pointer_cast<OpenQuarn::Attribute>(field.attribute));
}

HStatus noAttribute(const std::shared_ptr<Node>& node, const std::shared_ptr<OpenQuarn::Attribute>& wanted) {
    if (!node)
        return nothingAttached();
    return {HStatus::kNotFound,
            "node '" + node->name() + "' has no attribute '" + (wanted ? wanted->name : std::string("(null)")) + "'"};
}

HObject createNode(const std::shared_ptr<const NodeClass>& type, const std::string& wanted, const HString& name,
                   HStatus& outcome) {
    if (type)
        return Access::object(OpenQuarn::currentGraph().createNode(type, name.asStdString()));
    outcome = {HStatus::kNotFound, "no node type " + wanted + " is registered"};
    return {};
}

} // namespace

HFnDependencyNode::HFnDependencyNode(const HObject& node, HStatus* status) {
    const HStatus outcome = setObject(node);
    if (status)
        *status = outcome;
}

HObject HFnDependencyNode::create(const HString& typeName, const HString& name, HStatus* status) {
    return apiValue(Operation::HFnDependencyNode_create, status, HObject(), [&](HStatus& outcome) {
        object_ = HObject();
        object_ = createNode(OpenQuarn::findNodeClass(typeName.asStdString()), "'" + typeName.asStdString() + "'", name,
                             outcome);
        return object_;
    });
}

HObject HFnDependencyNode::create(const HTypeId& type, const HString& name, HStatus* status) {
    return apiValue(Operation::HFnDependencyNode_create, status, HObject(), [&](HStatus& outcome) {
        object_ = HObject();
        object_ = createNode(OpenQuarn::findNodeClass(type), OpenQuarn::hexText(type), name, outcome);
        return object_;
    });
}

HString HFnDependencyNode::name() const {
    const std::shared_ptr<Node> node = attached(object_);
    return node ? HString(node->name()) : HString();
}

HStatus HFnDependencyNode::setName(const HString& name) {
    return apiCall(Operation::HFnDependencyNode_setName, [&]() -> HStatus {
        const std::shared_ptr<Node> node = attached(object_);
        if (!node)
            return nothingAttached();
        node->graph().renameNode(*node, name.asStdString());
        return HStatus::kSuccess;
    });
}

HString HFnDependencyNode::typeName() const {
    const std::shared_ptr<Node> node = attached(object_);
    return node ? HString(node->type().name) : HString();
}

HTypeId HFnDependencyNode::typeId() const {
    const std::shared_ptr<Node> node = attached(object_);
    return node ? node->type().id : HTypeId();
}

HPxNode* HFnDependencyNode::userNode(HStatus* status) const {
    return apiValue(Operation::HFnDependencyNode_userNode, status, static_cast<HPxNode*>(nullptr),
                    [&](HStatus& outcome) -> HPxNode* {
                        const std::shared_ptr<Node> node = attached(object_);
                        if (!node)
                            outcome = nothingAttached();
                        return node && !node->type().plugin.empty() ? node->userNode() : nullptr;
                    });
}

HObject HFnDependencyNode::attribute(const HString& name, HStatus* status) const {
    return apiValue(Operation::HFnDependencyNode_attribute, status, HObject(), [&](HStatus& outcome) {
        const std::shared_ptr<Node> node = attached(object_);
        const OpenQuarn::Field* field = node ? node->type().find(name.asStdString()) : nullptr;
        if (field)
            return attributeObject(*field);
        outcome = node ? HStatus(HStatus::kNotFound,
                                 "node '" + node->name() + "' has no attribute '" + name.asStdString() + "'")
                       : nothingAttached();
        return HObject();
    });
}

unsigned HFnDependencyNode::attributeCount() const {
    const std::shared_ptr<Node> node = attached(object_);
    return node ? static_cast<unsigned>(node->type().fields().size()) : 0U;
}

HObject HFnDependencyNode::attribute(unsigned index, HStatus* status) const {
    return apiValue(Operation::HFnDependencyNode_attribute, status, HObject(), [&](HStatus& outcome) {
        const std::shared_ptr<Node> node = attached(object_);
        if (node && index < node->type().fields().size())
            return attributeObject(*node->type().fields()[index]);
        outcome = node ? HStatus(HStatus::kFailure,
                                 "node '" + node->name() + "' has no attribute number " + std::to_string(index))
                       : nothingAttached();
        return HObject();
    });
}

HPlug HFnDependencyNode::findPlug(const HString& name, HStatus* status) const {
    return apiValue(Operation::HFnDependencyNode_findPlug, status, HPlug(), [&](HStatus& outcome) {
        const std::shared_ptr<Node> node = attached(object_);
        const OpenQuarn::Field* field = node ? node->type().find(name.asStdString()) : nullptr;
        if (field)
            return HPlug(object_, attributeObject(*field));
        outcome = node ? HStatus(HStatus::kNotFound,
                                 "node '" + node->name() + "' has no attribute '" + name.asStdString() + "'")
                       : nothingAttached();
        return HPlug();
    });
}

HPlug HFnDependencyNode::findPlug(const HObject& attribute, HStatus* status) const {
    return apiValue(Operation::HFnDependencyNode_findPlug, status, HPlug(), [&](HStatus& outcome) {
        HPlug plug(object_, attribute);
        if (plug.isNull())
            outcome = noAttribute(attached(object_), Access::as<OpenQuarn::Attribute>(attribute));
        return plug;
    });
}

namespace {

void addConnected(const OpenQuarn::Slot& slot, HPlugArray& plugs) {
    if (slot.source() || slot.hasDestinations())
        plugs.push_back(OpenQuarn::makePlug(slot));
    slot.forEachPart([&](const OpenQuarn::Slot& part) { addConnected(part, plugs); });
}

} // namespace

HStatus HFnDependencyNode::getConnections(HPlugArray& plugs) const {
    return apiCall(Operation::HFnDependencyNode_getConnections, [&]() -> HStatus {
        const std::shared_ptr<Node> node = attached(object_);
        if (!node)
            return nothingAttached();
        plugs.clear();
        for (const auto& slot : node->data()->slots)
            addConnected(*slot, plugs);
        return HStatus::kSuccess;
    });
}

// --- HNodeClass ---

HNodeClass::HNodeClass(const HString& typeName)
    : impl_(OpenQuarn::findNodeClass(typeName.asStdString())) {}

bool HNodeClass::isNull() const {
    return impl_.expired();
}

HString HNodeClass::typeName() const {
    const auto type = impl_.lock();
    return type ? HString(type->name) : HString();
}

HTypeId HNodeClass::typeId() const {
    const auto type = impl_.lock();
    return type ? type->id : HTypeId();
}

HObject HNodeClass::attribute(const HString& name, HStatus* status) const {
    return apiValue(Operation::HNodeClass_attribute, status, HObject(), [&](HStatus& outcome) {
        const auto type = impl_.lock();
        const OpenQuarn::Field* field = type ? type->find(name.asStdString()) : nullptr;
        if (field)
            return attributeObject(*field);
        outcome = {HStatus::kNotFound,
                   type ? "node type '" + type->name + "' has no attribute '" + name.asStdString() + "'"
                        : "the node type is not registered"};
        return HObject();
    });
}
