// SPDX-License-Identifier: Apache-2.0
// The end of every exception: nothing is thrown at the host.
#pragma once

#include "openquarn_helpers/guard.h"

namespace neuralWarp {

using openquarn_helpers::guarded;
using openquarn_helpers::guardedAndShown;
using openquarn_helpers::statusOfException;

} // namespace neuralWarp
