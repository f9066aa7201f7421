// SPDX-License-Identifier: Apache-2.0
#include "controls/matrixChannels.h"

#include "controls/axes.h"
#include "openquarn/HTransformationMatrix.h"

namespace neuralWarp {
namespace {

using Values = std::vector<double>;

// HVector or HEulerRotation
template <class Triple>
void appendWanted(const Triple& triple, const std::array<bool, 3>& wanted, Values& values) {
    for (unsigned axis = 0; axis < 3; ++axis)
        if (wanted[axis])
            values.push_back(triple[axis]);
}

void append(const HVector& vector, Values& values) {
    values.insert(values.end(), {vector.x, vector.y, vector.z});
}

void appendQuaternion(const HQuaternion& quaternion, Values& values) {
    values.insert(values.end(), {quaternion.x, quaternion.y, quaternion.z, quaternion.w});
}

void appendAxes(const HMatrix& rotation, bool three, Values& values) {
    const AxisPair axes = orthonormalAxes(rotation.row(0), rotation.row(1));
    append(axes.x, values);
    append(axes.y, values);
    if (!three)
        return;
    const HVector z = rotation.row(2);
    append(z - axes.x * (z * axes.x) - axes.y * (z * axes.y), values); // of whatever length is left
}

void appendRotation(HEulerRotation rotation, const ChannelChoice& choice, Values& values) {
    for (unsigned axis = 0; axis < 3; ++axis)
        if (!choice.rotationAxes[axis])
            rotation[axis] = 0.0;
    switch (choice.conversion) {
    case ChannelChoice::kEuler:
        return appendWanted(rotation, choice.rotationAxes, values);
    case ChannelChoice::kQuaternion:
        return appendQuaternion(rotation.asQuaternion(), values);
    case ChannelChoice::kDoubleAxis:
    case ChannelChoice::kTripleAxis:
        return appendAxes(rotation.asMatrix(), choice.conversion == ChannelChoice::kTripleAxis, values);
    default:
        return;
    }
}

} // namespace

HStatus appendChannels(const HMatrix& matrix, const ChannelChoice& choice, Values& values) {
    const HTransformationMatrix transformation(matrix);
    HStatus status;
    if (choice.rotation)
        appendRotation(transformation.eulerRotation(), choice, values);
    if (choice.scale) {
        double scale[3] = {};
        if (status = transformation.getScale(scale, HSpace::kTransform); status.error())
            return status;
        appendWanted(scale, choice.scaleAxes, values);
    }
    if (choice.translation) {
        const HVector translation = transformation.translation(HSpace::kTransform, &status);
        if (status.error())
            return status;
        appendWanted(translation, choice.translationAxes, values);
    }
    return status;
}

} // namespace neuralWarp
