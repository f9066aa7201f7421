// SPDX-License-Identifier: Apache-2.0
// The numbers that the matrix converter makes of one matrix.
#pragma once

#include "openquarn/HMatrix.h"

#include <array>
#include <vector>

namespace neuralWarp {

/// What of a matrix is wanted. The switches of an axis count within their block only.
struct ChannelChoice {
    /// Forms of the rotation. A number that is none of them stands for no rotation values.
    enum Conversion : short { kEuler = 0, kQuaternion = 1, kDoubleAxis = 2, kTripleAxis = 3 };

    bool rotation = true;
    bool scale = true;
    bool translation = true;
    std::array<bool, 3> rotationAxes{true, true, true}; ///< x, y, z
    std::array<bool, 3> scaleAxes{true, true, true};
    std::array<bool, 3> translationAxes{true, true, true};
    short conversion = kEuler;
};

/// Appends the numbers of a matrix (row vectors, translation in row 3): rotation, scale, translation, each where it is
/// wanted. They are those of the host's decomposition, HTransformationMatrix, angles in radians.
///
/// In every form an axis of rotation that is switched off counts as not turned about. Euler then leaves out its angle;
/// the others have the same number of values whatever the switches say: a quaternion 4 (x, y, z, w), two axes 6, three
/// axes 9. Fails when the host's decomposition does. [any]
HStatus appendChannels(const HMatrix& matrix, const ChannelChoice& choice, std::vector<double>& values);

} // namespace neuralWarp
