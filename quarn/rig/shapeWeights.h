// SPDX-License-Identifier: Apache-2.0
// The weights of a blend shape node, combinations included.
#pragma once

#include "rig/combinedWeight.h"

#include "openquarn/HDataBlock.h"

#include <vector>

namespace rig {

/// All weights of the node in a frame, ascending by shape: of a shape with a combination that one's, of the others what
/// `weight` holds. Fails, naming plug and value, as combineWeight() does, for a factor that has a combination itself,
/// and for a weight that is not finite. [eval]
HStatus readShapeWeights(HDataBlock& block, std::vector<ShapeWeight>& weights);

} // namespace rig
