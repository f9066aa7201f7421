// SPDX-License-Identifier: Apache-2.0
#include "graph/Context.h"

#include "graph/Graph.h"

namespace OpenQuarn {
namespace {

thread_local Context* current = nullptr;

void dropPluginData(Slot& slot) {
    if (slot.field.attribute->data == HFnData::kPlugin)
        slot.data = nullptr;
    slot.forEachPart([](Slot& part) { dropPluginData(part); });
}

void markConnectedOrComputed(Slot& slot, const Slot& normal) {
    if (slot.field.computed || normal.source())
        slot.markDirty();
    for (std::size_t i = 0; i < slot.children().size(); ++i)
        markConnectedOrComputed(*slot.children()[i], *normal.children()[i]);
    slot.elements().forEach([&](unsigned index, const std::shared_ptr<Slot>& element) {
        const std::shared_ptr<Slot> counterpart = normal.elements().find(index);
        if (counterpart)
            markConnectedOrComputed(*element, *counterpart);
    });
}

} // namespace

Context* currentContext() {
    return current;
}

ContextScope::ContextScope(Context* context)
    : previous_(current) {
    current = context;
}
ContextScope::~ContextScope() {
    current = previous_;
}

// blocks and handles that are still held see the data as gone
Context::~Context() {
    for (const auto& [node, entry] : data_)
        entry.data->bury();
}

void Context::setTime(double time) {
    time_ = time;
    for (const auto& [node, entry] : data_)
        if (node->isAlive())
            fill(*entry.data);
}

std::shared_ptr<NodeData> Context::dataOf(Node& node) {
    Entry& entry = data_[&node];
    std::shared_ptr<NodeData>& data = entry.data;
    if (!data) {
        entry.node = std::static_pointer_cast<Node>(node.shared_from_this());
        data = std::make_shared<NodeData>(node, this);
        for (std::size_t i = 0; i < data->slots.size(); ++i) {
            data->slots[i]->copyFrom(*node.data()->slots[i]);
            dropPluginData(*data->slots[i]);
        }
        fill(*data);
    }
    return data;
}

void Context::fill(NodeData& data) {
    for (std::size_t i = 0; i < data.slots.size(); ++i)
        markConnectedOrComputed(*data.slots[i], *data.node.data()->slots[i]);
    if (data.filterState)
        data.filterState->connectionsChanged();
    data.node.graph().setTimeIn(data, time_);
}

std::shared_ptr<NodeData> dataIn(Context* context, Node& node) {
    return context ? context->dataOf(node) : node.data();
}

std::shared_ptr<Slot> slotIn(const NodeData& data, const Slot& slot, bool create) {
    if (!slot.parent)
        return data.slot(slot.field);
    const std::shared_ptr<Slot> parent = slotIn(data, *slot.parent, create);
    if (!parent)
        return nullptr;
    if (!slot.isElement)
        return parent->child(slot.field);
    return create ? parent->elementAt(slot.index) : parent->elements().find(slot.index);
}

// connections are always the scene's (decision 0033)
std::shared_ptr<Slot> sourceInContext(const Slot& slot) {
    if (!slot.owner)
        return nullptr;
    if (!slot.owner->context) {
        Slot* source = slot.source();
        return source ? source->shared_from_this() : nullptr;
    }
    const std::shared_ptr<Slot> normal = slotIn(*slot.owner->node.data(), slot, false);
    Slot* source = normal ? normal->source() : nullptr;
    if (!source || !source->owner)
        return nullptr;
    const std::shared_ptr<NodeData> data = slot.owner->context->dataOf(source->owner->node);
    return slotIn(*data, *source, true);
}

HDGContext contextHandle(const Context* context) {
    HDGContext handle;
    if (context)
        Access::setContext(handle, context->time());
    return handle;
}

} // namespace OpenQuarn

HDGContext HDGContext::current() {
    return OpenQuarn::contextHandle(OpenQuarn::currentContext());
}

double HDGContext::time() const {
    if (!normal_)
        return time_;
    const OpenQuarn::Graph* graph = OpenQuarn::Graph::current();
    return graph ? graph->time() : 0.0;
}
