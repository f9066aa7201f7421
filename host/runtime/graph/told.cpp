// SPDX-License-Identifier: Apache-2.0
#include "graph/told.h"

#include "graph/arrayLock.h"

#include <algorithm>

namespace OpenQuarn {
namespace {

/// Upwards through the graph with a stack of its own, so that a long chain needs no deep one (decision 0110).
class ForgettingWalk {
public:
    void from(Slot& slot) {
        lookUpstreamOf(slot);
        while (!pending_.empty()) {
            const std::shared_ptr<Slot> next = std::move(pending_.back());
            pending_.pop_back();
            lookUpstreamOf(*next);
        }
    }

private:
    void lookUpstreamOf(Slot& slot) {
        if (!slot.owner || slot.owner->context) // connections, and so walks, are the scene's
            return;
        for (const Slot* above = slot.parent; above; above = above->parent)
            lookAlongLinks(*above);
        lookAlongLinksBelow(slot);
        lookAtInputs(slot, slot.field);
    }

    void lookAlongLinks(const Slot& slot) {
        if (!slot.links)
            return;
        if (Slot* source = slot.links->source)
            forget(*source);
        if (!slot.links->rare)
            return;
        for (const std::weak_ptr<Slot>& announcer : slot.links->rare->announcers)
            if (const std::shared_ptr<Slot> known = announcer.lock())
                forget(*known);
    }

    void lookAlongLinksBelow(const Slot& slot) {
        lookAlongLinks(slot);
        if (!slot.isLeaf())
            forEachPartKept(slot, [this](Slot& part) { lookAlongLinksBelow(part); });
    }

    // what the slot, or something below it, depends on within its node
    void lookAtInputs(const Slot& slot, const Field& field) {
        for (const Field::Dependency& dependency : field.affectedBy)
            lookAtInput(slot, dependency);
        for (const std::unique_ptr<Field>& child : field.children)
            lookAtInputs(slot, *child);
    }

    // the whole of the outermost attribute, or of its element, that the input is a part of: more than has to be
    void lookAtInput(const Slot& slot, const Field::Dependency& dependency) {
        const Field* outermost = dependency.field;
        while (outermost->parent)
            outermost = outermost->parent;
        const std::shared_ptr<Slot>& whole = slot.owner->slots[outermost->position];
        const std::shared_ptr<Slot> same = dependency.sameElement ? sameElement(*whole, slot) : nullptr;
        forget(same ? *same : *whole);
    }

    static std::shared_ptr<Slot> sameElement(const Slot& array, const Slot& slot) {
        const Slot* element = outermostElement(slot);
        const ArrayReadLock lock(array.owner);
        return element ? array.elements().find(element->index) : nullptr;
    }

    void forget(Slot& slot) {
        if (!slot.mayHaveTold())
            return;
        if (slot.hasTold())
            pending_.push_back(slot.shared_from_this());
        else
            forEachPartKept(slot, [this](Slot& part) { forget(part); });
        slot.forgetTold();
    }

    std::vector<std::shared_ptr<Slot>> pending_; // have told of late
};

} // namespace

void forgetToldUpstream(Slot& slot) {
    ForgettingWalk().from(slot);
}

void announce(Slot& announcer, Slot& dependent) {
    std::vector<std::weak_ptr<Slot>>& known = dependent.rare().announcers;
    known.erase(std::remove_if(known.begin(), known.end(),
                               [&](const std::weak_ptr<Slot>& other) {
                                   const std::shared_ptr<Slot> slot = other.lock();
                                   return !slot || slot.get() == &announcer;
                               }),
                known.end());
    known.push_back(announcer.weak_from_this());
}

} // namespace OpenQuarn
