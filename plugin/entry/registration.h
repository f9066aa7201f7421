// SPDX-License-Identifier: Apache-2.0
// What the plug-in offers the host.
#pragma once

#include "openquarn/HObject.h"
#include "openquarn/HStatus.h"

namespace neuralWarp {

/// Registers the data type, the deformer, its GPU deformer, the command, the message catalogue and the control nodes,
/// in this order. The first step that fails is printed and returned, and nothing after it is tried; only the catalogue
/// may fail: its texts then show as they are written in the code. [main]
HStatus registerPlugin(HObject plugin);

/// Deregisters all of it but the catalogue, until a step fails, which is printed and returned. [main]
HStatus deregisterPlugin(HObject plugin);

} // namespace neuralWarp
