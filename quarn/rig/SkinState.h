// SPDX-License-Identifier: Apache-2.0
// What a skin cluster keeps of one geometry from one frame to the next.
#pragma once

#include "rig/SkinWeights.h"
#include "rig/linearBlend.h"

#include "openquarn/HObject.h"
#include "openquarn/HPointArray.h"

#include <vector>

namespace rig {

/// What the skin of a geometry is made of. Data in the graph never changes: other values are another object.
struct SkinSource {
    HObject counts;
    HObject influences;
    HObject weights;
    bool normalize = false;

    bool operator==(const SkinSource&) const = default;
};

/// Lists read and checked once, and memory to work in. For one thread at a time.
struct SkinState {
    SkinSource source;      ///< what the two below were made of; holding it, no other object can have its address
    bool isCurrent = false; ///< something has been made
    HStatus status;         ///< of checking the lists
    SkinWeights skin;       ///< meaningful when `status` is a success; of no vertices: nobody has bound the geometry

    std::vector<Affine> joints; ///< of the present frame
    HPointArray points;         ///< of the present frame
};

} // namespace rig
