// SPDX-License-Identifier: Apache-2.0
#include "openquarn/HPxNode.h"

#include "core/apiCall.h"
#include "graph/Context.h"
#include "graph/Graph.h"
#include "graph/evaluation.h"
#include "graph/plugImpl.h"
#include "graph/values.h"
#include "openquarn/HExternalContentInfoTable.h"
#include "openquarn/HExternalContentLocationTable.h"
#include "openquarn/HFileObject.h"
#include "types/baseNodes.h"

using OpenQuarn::Access;
using OpenQuarn::apiCall;
using OpenQuarn::isRefused;
using OpenQuarn::Operation;

const HObject HPxNode::message = Access::object(OpenQuarn::messageAttribute());

HPxNode::HPxNode()
    : impl_(OpenQuarn::nodeUnderConstruction()) {}
HPxNode::~HPxNode() = default;

void HPxNode::postConstructor() {}
HStatus HPxNode::compute(const HPlug&, HDataBlock&) {
    return HStatus::kUnknownParameter;
}
HStatus HPxNode::setDependentsDirty(const HPlug&, HPlugArray&) {
    return HStatus::kSuccess;
}
HStatus HPxNode::connectionMade(const HPlug&, const HPlug&, bool) {
    return HStatus::kSuccess;
}
HStatus HPxNode::connectionBroken(const HPlug&, const HPlug&, bool) {
    return HStatus::kSuccess;
}

HObject HPxNode::thisHObject() const {
    return Access::object(impl_.lock());
}

HString HPxNode::name() const {
    const auto node = impl_.lock();
    return node ? HString(node->name()) : HString();
}

HString HPxNode::typeName() const {
    const auto node = impl_.lock();
    return node ? HString(node->type().name) : HString();
}

HTypeId HPxNode::typeId() const {
    const auto node = impl_.lock();
    return node ? node->type().id : HTypeId();
}

HDataBlock HPxNode::forceCache() {
    const auto node = isRefused(Operation::HPxNode_forceCache) ? nullptr : impl_.lock();
    return node ? Access::make<HDataBlock>(dataIn(OpenQuarn::currentContext(), *node)) : HDataBlock();
}

namespace {

/// Runs `change` on the type whose initializer is running.
template <class Change>
HStatus changeType(Operation point, Change&& change) {
    return apiCall(point, [&]() -> HStatus {
        OpenQuarn::NodeClass* type = OpenQuarn::ClassUnderConstruction::current();
        if (!type)
            return {HStatus::kFailure,
                    std::string(OpenQuarn::operationName(point)) + ": no node type is being registered"};
        return change(*type);
    });
}

} // namespace

HStatus HPxNode::addAttribute(const HObject& attribute) {
    return changeType(Operation::HPxNode_addAttribute, [&](OpenQuarn::NodeClass& type) -> HStatus {
        const auto added = Access::as<OpenQuarn::Attribute>(attribute);
        if (!added)
            return {HStatus::kInvalidParameter, "the object is no attribute"};
        type.add(added);
        return HStatus::kSuccess;
    });
}

HStatus HPxNode::attributeAffects(const HObject& affecting, const HObject& affected) {
    return attributeAffects(affecting, affected, false);
}

HStatus HPxNode::attributeAffects(const HObject& affecting, const HObject& affected, bool affectsTree) {
    return changeType(Operation::HPxNode_attributeAffects, [&](OpenQuarn::NodeClass& type) -> HStatus {
        const auto from = Access::as<OpenQuarn::Attribute>(affecting);
        const auto to = Access::as<OpenQuarn::Attribute>(affected);
        if (!from || !to)
            return {HStatus::kInvalidParameter, "one of the objects is no attribute"};
        type.affects(*from, *to, affectsTree);
        return HStatus::kSuccess;
    });
}

// --- files and external content ---

namespace {

void addFileTexts(const OpenQuarn::Slot& slot, HStringArray& files, bool unresolved) {
    if (slot.isLeaf() && slot.field.attribute->filename) {
        HString path(textIn(slot));
        if (!unresolved && !path.isEmpty()) {
            HFileObject file;
            file.setRawFullName(path);
            path = file.resolvedFullName();
        }
        if (!path.isEmpty())
            files.append(path);
    }
    slot.forEachPart([&](const OpenQuarn::Slot& part) { addFileTexts(part, files, unresolved); });
}

std::shared_ptr<OpenQuarn::Slot> textSlot(OpenQuarn::Node* node, const HObject& attribute) {
    const auto wanted = Access::as<OpenQuarn::Attribute>(attribute);
    const OpenQuarn::Field* field = node && wanted ? node->type().find(*wanted) : nullptr;
    const auto slot = field ? node->data()->slot(*field) : nullptr;
    return slot && slot->isLeaf() && wanted->data == HFnData::kString ? slot : nullptr;
}

HStatus noText(const OpenQuarn::Node* node, const HObject& attribute) {
    const auto wanted = Access::as<OpenQuarn::Attribute>(attribute);
    return {HStatus::kInvalidParameter, "node '" + (node ? node->name() : std::string()) + "' has no text attribute '" +
                                            (wanted ? wanted->name : std::string()) + "'"};
}

} // namespace

HStringArray HPxNode::getFilesToArchive(bool, bool unresolvedName, bool) const {
    HStringArray files;
    if (const auto node = impl_.lock())
        for (const auto& slot : node->data()->slots)
            addFileTexts(*slot, files, unresolvedName);
    return files;
}

void HPxNode::getExternalContent(HExternalContentInfoTable&) const {}
void HPxNode::setExternalContent(const HExternalContentLocationTable&) {}

HStatus HPxNode::addExternalContentForFileAttr(HExternalContentInfoTable& table, const HObject& attribute) const {
    return apiCall(Operation::HPxNode_addExternalContentForFileAttr, [&]() -> HStatus {
        const auto node = impl_.lock();
        const auto slot = textSlot(node.get(), attribute);
        if (!slot)
            return noText(node.get(), attribute);
        HFileObject file;
        file.setRawFullName(textIn(*slot));
        const HString resolved = file.resolvedFullName();
        const HString& key = slot->field.attribute->name;
        if (!file.exists())
            return table.addUnresolvedEntry(key, file.rawFullName(), node->name());
        return table.addResolvedEntry(key, file.rawFullName(), resolved, node->name());
    });
}

HStatus HPxNode::setExternalContentForFileAttr(const HObject& attribute, const HExternalContentLocationTable& table) {
    return apiCall(Operation::HPxNode_setExternalContentForFileAttr, [&]() -> HStatus {
        const auto node = impl_.lock();
        const auto slot = textSlot(node.get(), attribute);
        if (!slot)
            return noText(node.get(), attribute);
        HString location;
        if (table.getLocation(slot->field.attribute->name, location).error())
            return HStatus::kSuccess;
        return HPlug(thisHObject(), attribute).setString(location);
    });
}
