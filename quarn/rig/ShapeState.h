// SPDX-License-Identifier: Apache-2.0
// What a blend shape node keeps of one geometry from one frame to the next.
#pragma once

#include "rig/ShapeDeltas.h"
#include "rig/addShapes.h"

#include "openquarn/HObject.h"
#include "openquarn/HPointArray.h"

#include <vector>

namespace rig {

/// The lists of one shape, read and checked once. Data in the graph never changes: other values are another object.
struct KeptShape {
    std::uint32_t index = 0; ///< of the element
    HObject vertices;        ///< what `deltas` was made of; held, so that no other object can have its address
    HObject values;
    bool isCurrent = false; ///< something has been made
    HStatus status;         ///< of checking the lists
    ShapeDeltas deltas;     ///< meaningful when `status` is a success
};

/// For one thread at a time.
struct ShapeState {
    std::vector<KeptShape> shapes; ///< the elements that there are, ascending
    std::vector<WeightedShape> active;
    std::vector<double> sums;
    HPointArray points;
};

} // namespace rig
