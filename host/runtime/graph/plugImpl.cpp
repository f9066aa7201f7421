// SPDX-License-Identifier: Apache-2.0
#include "graph/plugImpl.h"

#include "graph/Context.h"
#include "graph/arrayLock.h"
#include "graph/evaluation.h"

#include <algorithm>

namespace OpenQuarn {
namespace {

// `used` counts the indices that the way down to the field has taken
std::shared_ptr<Slot> descend(const NodeData& data, const HPlug::Impl& plug, const Field& field, bool create,
                              std::size_t& used) {
    std::shared_ptr<Slot> slot;
    if (field.parent) {
        const std::shared_ptr<Slot> parent = descend(data, plug, *field.parent, create, used);
        slot = parent ? parent->child(field) : nullptr;
    } else {
        slot = data.slot(field);
    }
    if (!slot || !field.isArray())
        return slot;
    const std::optional<unsigned> index = plug.indices[used++];
    if (!index)
        return &field == plug.field ? slot : nullptr;
    if (create)
        return slot->elementAt(*index);
    const ArrayReadLock lock(slot->owner);
    return slot->elements().find(*index);
}

std::shared_ptr<Slot> nearestIn(const NodeData& data, const HPlug::Impl& plug, const Field& field, bool& exists) {
    std::shared_ptr<Slot> slot = field.parent ? nearestIn(data, plug, *field.parent, exists) : data.slot(field);
    if (!exists)
        return slot;
    if (field.parent)
        slot = slot->child(field);
    const std::optional<unsigned> index = field.isArray() ? plug.indices[arrayDepth(field) - 1] : std::nullopt;
    const std::shared_ptr<Slot> element = index ? slot->elements().find(*index) : nullptr;
    exists = !field.isArray() || element || (&field == plug.field && !index);
    return element ? element : slot;
}

} // namespace

std::size_t arrayDepth(const Field& field) {
    return (field.isArray() ? 1U : 0U) + (field.parent ? arrayDepth(*field.parent) : 0U);
}

HPlug plugOf(HPlug::Impl impl) {
    return Access::make<HPlug>(std::make_shared<const HPlug::Impl>(std::move(impl)));
}

const HPlug::Impl* plugImpl(const HPlug& plug) {
    const std::shared_ptr<const HPlug::Impl>& impl = Access::impl(plug);
    return impl && impl->node->isAlive() ? impl.get() : nullptr;
}

HPlug makePlug(const Slot& slot) {
    if (!slot.owner || slot.owner->isGone())
        return {};
    HPlug::Impl impl;
    impl.node = std::static_pointer_cast<Node>(slot.owner->node.shared_from_this());
    impl.field = &slot.field;
    for (const Slot* at = &slot; at; at = at->parent) {
        if (at->isElement)
            impl.indices.emplace_back(at->index);
        else if (at->isArray() && at == &slot)
            impl.indices.emplace_back(std::nullopt);
    }
    std::reverse(impl.indices.begin(), impl.indices.end());
    return plugOf(std::move(impl));
}

std::shared_ptr<Slot> resolvePlugIn(const NodeData& data, const HPlug& plug, bool create) {
    const HPlug::Impl* impl = plugImpl(plug);
    std::size_t used = 0;
    return impl ? descend(data, *impl, *impl->field, create, used) : nullptr;
}

std::shared_ptr<Slot> nearestExisting(Context* context, const HPlug& plug) {
    const HPlug::Impl* impl = plugImpl(plug);
    bool exists = true;
    return impl ? nearestIn(*dataIn(context, *impl->node), *impl, *impl->field, exists) : nullptr;
}

std::shared_ptr<Slot> resolvePlug(Context* context, const HPlug& plug, bool create) {
    const HPlug::Impl* impl = plugImpl(plug);
    return impl ? resolvePlugIn(*dataIn(context, *impl->node), plug, create) : nullptr;
}

std::shared_ptr<Slot> slotToEvaluate(Context* context, const HPlug& plug) {
    const HPlug::Impl* impl = plugImpl(plug);
    if (!impl)
        return nullptr;
    std::shared_ptr<Slot> slot = resolvePlug(context, plug, impl->field->computed);
    if (slot)
        return slot;
    for (const Slot* at = nearestExisting(context, plug).get(); at; at = at->parent)
        if (sourceInContext(*at)) {
            pull(std::const_pointer_cast<Slot>(at->shared_from_this()));
            return resolvePlug(context, plug);
        }
    return nullptr;
}

TentativeSlot::TentativeSlot(const HPlug& plug)
    : slot_(resolvePlug(normalContext, plug)) {
    if (slot_)
        return;
    const std::shared_ptr<Slot> existing = nearestExisting(normalContext, plug);
    slot_ = resolvePlug(normalContext, plug, true);
    for (Slot* at = slot_.get(); at && at != existing.get(); at = at->parent)
        made_ = at;
}

TentativeSlot::~TentativeSlot() {
    if (made_ && made_->parent)
        made_->parent->removeElement(made_->index);
}

} // namespace OpenQuarn
