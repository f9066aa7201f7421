// SPDX-License-Identifier: Apache-2.0
// Trying a model without saving that.
#pragma once

#include "quarn/scene/Warp.h"

#include <string>

namespace quarn {

/// Has the deformer apply the model `name` of its modelRoot to a geometry. Throws std::runtime_error when the plugs
/// cannot be set, as when something is connected into them. Thread: main.
void useModel(const Warp& warp, const WarpGeometry& geometry, const std::string& name);

} // namespace quarn
