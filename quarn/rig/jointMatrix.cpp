// SPDX-License-Identifier: Apache-2.0
#include "rig/jointMatrix.h"

namespace rig {
namespace {

HEulerRotation angles(const HVector& vector, HEulerRotation::RotationOrder order) {
    return {vector.x, vector.y, vector.z, order};
}

} // namespace

HMatrix jointMatrix(const JointChannels& channels) {
    HMatrix local = angles(channels.rotate, channels.order).asMatrix() *
                    angles(channels.jointOrient, HEulerRotation::kXYZ).asMatrix();
    for (unsigned axis = 0; axis < 3; ++axis)
        local.setRow(axis, local.row(axis) * channels.scale[axis]);
    local.setRow(3, channels.translate);
    return local;
}

} // namespace rig
