// SPDX-License-Identifier: Apache-2.0
#include "graph/dirty.h"

#include "graph/Graph.h"
#include "graph/Node.h"
#include "graph/plugImpl.h"
#include "graph/told.h"

#include <unordered_set>

namespace OpenQuarn {
namespace {

bool isAtOrAbove(const Slot& above, const Slot* slot) {
    for (; slot; slot = slot->parent)
        if (slot == &above)
            return true;
    return false;
}

/// One walk through the graph, breadth first, so that a long chain needs no deep stack (decision 0031).
class DirtyWalk {
public:
    explicit DirtyWalk(bool force)
        : force_(force) {}

    void start(Slot& slot) {
        edited(slot);
        queue_.push_back(&slot);
    }
    /// What is not told by a change further up: a value was set, a connection made or broken.
    static void edited(Slot& slot) {
        if (slot.owner && slot.owner->filterState)
            slot.owner->filterState->edited(slot);
    }

    void run() {
        for (std::size_t next = 0; next < queue_.size(); ++next) // NOLINT(modernize-loop-convert): it grows meanwhile
            visit(*queue_[next]);
    }

    void pushDependents(Slot& slot) {
        if (slot.owner && slot.owner->filterState)
            slot.owner->filterState->changed(slot);
        forEachDependent(slot, [&](Slot& dependent) { queue_.push_back(&dependent); });
        if (slot.owner)
            pushPluginDependents(*slot.owner, slot);
    }

private:
    void visit(Slot& slot) {
        if (force_ ? !seen_.insert(&slot).second : slot.hasTold())
            return;
        const bool isNews = force_ || !slot.isDirty();
        slot.markTold();
        if (force_)
            edited(slot);
        if (slot.owner && isNews)
            slot.owner->node.graph().recordDirty(slot);
        pushDependents(slot);
    }

    // what the plug-in adds to the declared dependencies
    void pushPluginDependents(NodeData& data, Slot& slot) {
        HPxNode* user = data.node.userNode();
        if (!user)
            return;
        HPlugArray affected;
        callPlugin(data.node, "setDependentsDirty", [&] { return user->setDependentsDirty(makePlug(slot), affected); });
        for (const HPlug& plug : affected)
            if (const std::shared_ptr<Slot> dependent = resolvePlug(data.context, plug)) {
                announce(slot, *dependent);
                queue_.push_back(dependent.get());
            }
    }

    const bool force_;
    std::vector<Slot*> queue_;
    std::unordered_set<const Slot*> seen_;
};

} // namespace

std::shared_ptr<Slot> dependentSlot(const Slot& slot, const Field::Dependency& dependent) {
    if (!slot.owner)
        return nullptr;
    std::shared_ptr<Slot> affected = slot.owner->slot(*dependent.field);
    if (!affected || !dependent.sameElement || !affected->isArray())
        return affected;
    const Slot* element = outermostElement(slot);
    return element ? affected->elements().find(element->index) : affected;
}

void propagateFrom(Slot& changed, bool force) {
    DirtyWalk walk(force);
    DirtyWalk::edited(changed);
    walk.pushDependents(changed);
    walk.run();
}

void makeDirty(Slot& slot, bool force) {
    DirtyWalk walk(force);
    walk.start(slot);
    walk.run();
}

bool reaches(Slot& from, const Slot& to) {
    std::vector<Slot*> queue{&from};
    std::unordered_set<const Slot*> seen{&from};
    for (std::size_t next = 0; next < queue.size(); ++next) {
        Slot& slot = *queue[next];
        if (isAtOrAbove(slot, &to) || isAtOrAbove(to, &slot))
            return true;
        forEachDependent(slot, [&](Slot& dependent) {
            if (seen.insert(&dependent).second)
                queue.push_back(&dependent);
        });
    }
    return false;
}

} // namespace OpenQuarn
