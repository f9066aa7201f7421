// SPDX-License-Identifier: Apache-2.0
// Where a joint lies in the space of its parent.
#pragma once

#include "openquarn/HEulerRotation.h"
#include "openquarn/HMatrix.h"
#include "openquarn/HVector.h"

namespace rig {

/// What a joint is placed by.
struct JointChannels {
    HVector translate;
    HVector rotate; ///< radians
    HEulerRotation::RotationOrder order = HEulerRotation::kXYZ;
    HVector jointOrient; ///< radians, about x, y and z in this order
    HVector scale{1.0, 1.0, 1.0};
};

/// S * R * JO * T, for row vectors. [any]
HMatrix jointMatrix(const JointChannels& channels);

} // namespace rig
