// SPDX-License-Identifier: Apache-2.0
// Point caches that stand in for a skin, and remember which one: a pointCache with something in its replacedMesh.
#pragma once

#include "openquarn/HPlug.h"

namespace quarn {

/// What was there before the cache that gives out this plug; null when no such cache does. Thread: main.
HPlug skinReplacedBy(const HPlug& geometry);

/// What the cache gives out that stands in for what is connected into this plug; null when the plug is of none.
HPlug replacementAt(const HPlug& destination);

} // namespace quarn
