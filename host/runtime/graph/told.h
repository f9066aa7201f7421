// SPDX-License-Identifier: Apache-2.0
// Who has told. A slot that is dirty has told when everything that depends on it is dirty and has told: a walk that
// makes things dirty (dirty.h) ends there. An evaluation need not read all that it depends on. When it leaves something
// unread, its result is up to date and what it left is not, and then the latter has to tell again at its next change.
#pragma once

#include "graph/Slot.h"

namespace OpenQuarn {

/// To be called for a slot that has become clean, or come into being: nothing upstream of it has told any more.
///
/// Costs a look at what it depends on directly. It goes on along what had told, and each of those has been told of a
/// change once since: all in all it costs no more than the walks that told them. Thread: any, inside of evaluations
/// too, where several threads may be at it.
void forgetToldUpstream(Slot& slot);

/// A plug-in says that `dependent` depends on `announcer`, beyond what is declared and connected. Thread: main, outside
/// of evaluations.
void announce(Slot& announcer, Slot& dependent);

} // namespace OpenQuarn
