// SPDX-License-Identifier: Apache-2.0
// The rig nodes, as a plug-in.
#pragma once

#include "openquarn/HObject.h"
#include "openquarn/HStatus.h"

namespace rig {

/// Registers the node types of this folder. Stops at the first that fails, which is printed and returned. [main]
HStatus registerNodes(HObject plugin);
/// Deregisters them, in the reverse order. [main]
HStatus deregisterNodes(HObject plugin);

} // namespace rig
