// SPDX-License-Identifier: Apache-2.0
// Errors for the user, while the user is looking.
#pragma once

#include "openquarn/HString.h"

namespace neuralWarp {

/// Shows an error in the normal evaluation context while the animation is neither playing nor being scrubbed; at all
/// other times, when it would come back with every frame, it is dropped. True when it was shown. [any]
bool displayErrorGated(const HString& text);

} // namespace neuralWarp
