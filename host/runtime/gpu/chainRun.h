// SPDX-License-Identifier: Apache-2.0
// One frame of a chain on the device.
#pragma once

#include "gpu/Chain.h"

namespace OpenQuarn {

/// Uploads what is not on the device, runs the deformers one after the other, each on what the one before wrote, and
/// downloads what the last one wrote. Null when something failed, which is noted (failure.h).
std::shared_ptr<MeshData> runChain(Chain& chain, const std::shared_ptr<Device>& device);

} // namespace OpenQuarn
