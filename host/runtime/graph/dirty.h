// SPDX-License-Identifier: Apache-2.0
// Dirty propagation: what has to be evaluated again after a change.
#pragma once

#include "graph/Slot.h"

namespace OpenQuarn {

/// Calls visit(slot) for everything that depends on `slot` directly: along the connections that begin at it, above it
/// or below it, and within its node.
template <class Visit>
void forEachDependent(Slot& slot, Visit&& visit);

/// After `changed` got another value: makes everything dirty that depends on it, but not the slot itself. A slot that
/// is dirty already stays as it is. What depends on it is walked as well, except where it has told before (told.h) and
/// `force` does not ask for it. Thread: main.
void propagateFrom(Slot& changed, bool force = false);

/// Makes `slot`, everything below it and everything that depends on it dirty.
void makeDirty(Slot& slot, bool force = false);

/// True when a change of `from` reaches `to`, or something above or below it.
bool reaches(Slot& from, const Slot& to);

/// A slot of the node's other field that depends on `slot`: the field's own, or its element of the same index.
std::shared_ptr<Slot> dependentSlot(const Slot& slot, const Field::Dependency& dependent);

template <class Visit>
void forEachDependent(Slot& slot, Visit&& visit) {
    const auto along = [&](const Slot& connected) {
        if (connected.links)
            for (Slot* destination : connected.links->destinations)
                visit(*destination);
    };
    const auto below = [&](auto&& self, const Slot& part) -> void {
        along(part);
        part.forEachPart([&](const Slot& deeper) { self(self, deeper); });
    };
    below(below, slot);
    for (const Slot* above = slot.parent; above; above = above->parent)
        along(*above);
    for (const Field::Dependency& dependent : slot.field.dependents)
        if (const std::shared_ptr<Slot> affected = dependentSlot(slot, dependent))
            visit(*affected);
}

} // namespace OpenQuarn
