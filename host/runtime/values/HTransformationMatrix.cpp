// SPDX-License-Identifier: Apache-2.0
// Decomposition into scale, shear and a proper rotation: Gram-Schmidt on the rows, the order of parts as in
// S. W. Thomas, "Decomposing a Matrix into Simple Transformations", Graphics Gems II. Each row is orthogonalised twice,
// which keeps the axes orthonormal to rounding however small what is left of it (W. Kahan, B. Parlett: "twice is
// enough"); axes that dependent rows leave open are completed.
#include "openquarn/HTransformationMatrix.h"

#include "core/apiCall.h"
#include "values/invertMatrix.h"

#include <algorithm>
#include <cmath>
#include <limits>

using OpenQuarn::apiCall;
using OpenQuarn::apiValue;
using OpenQuarn::Operation;

namespace {

constexpr double epsilon = std::numeric_limits<double>::epsilon();
constexpr double dependentBelow = 4 * epsilon; // of the length of a row: what rounding leaves of a dependent one

struct Parts {
    HVector scale;
    double shear[3][3] = {}; // [row][earlier row]
    HVector axis[3];
    bool known[3] = {};
};

/// A row times a power of two, which is exact, with its largest value from 1 to 2; so that no square overflows.
struct ScaledRow {
    HVector values;
    int exponent = 0;
    explicit ScaledRow(const HVector& row)
        : values(row) {
        const double largest = std::max({std::abs(row.x), std::abs(row.y), std::abs(row.z)});
        if (largest == 0.0 || !std::isfinite(largest))
            return;
        exponent = std::ilogb(largest);
        values = {std::scalbn(row.x, -exponent), std::scalbn(row.y, -exponent), std::scalbn(row.z, -exponent)};
    }
};

/// Splits row `index` into what lies along the axes of earlier rows and an axis of its own.
void splitRow(Parts& parts, unsigned index, const HVector& row) {
    const ScaledRow scaled(row);
    HVector rest = scaled.values;
    double along[3] = {};
    for (int pass = 0; pass < 2; ++pass)
        for (unsigned earlier = 0; earlier < index; ++earlier) {
            if (!parts.known[earlier])
                continue;
            const double part = rest * parts.axis[earlier];
            along[earlier] += part;
            rest -= parts.axis[earlier] * part;
        }
    const double size = scaled.values.length();
    double own = rest.length();
    parts.known[index] = own > dependentBelow * size;
    if (parts.known[index])
        parts.axis[index] = rest / own;
    else
        own = epsilon * size;
    parts.scale[index] = std::scalbn(own, scaled.exponent);
    for (unsigned earlier = 0; earlier < index && own != 0.0; ++earlier)
        parts.shear[index][earlier] = along[earlier] / own;
}

/// A unit vector perpendicular to `axis`, close to coordinate axis `index` where that is possible.
HVector perpendicular(const HVector& axis, unsigned index) {
    constexpr double tooClose = 0.9; // cosine
    HVector candidate;
    candidate[std::abs(axis[index]) < tooClose ? index : (index + 1) % 3] = 1.0;
    return (candidate - axis * (candidate * axis)).normal();
}

void completeAxes(Parts& parts) {
    for (unsigned i = 0; i < 3; ++i) {
        if (parts.known[i])
            continue;
        const unsigned next = (i + 1) % 3;
        const unsigned last = (i + 2) % 3;
        if (parts.known[next] && parts.known[last])
            parts.axis[i] = parts.axis[next] ^ parts.axis[last];
        else if (parts.known[next] || parts.known[last])
            parts.axis[i] = perpendicular(parts.axis[parts.known[next] ? next : last], i);
        else
            parts.axis[i][i] = 1.0;
        parts.known[i] = true;
    }
}

/// A mirroring turned into scales below 0. The shears stay: they are ratios of the two.
void makeProper(Parts& parts) {
    if ((parts.axis[0] ^ parts.axis[1]) * parts.axis[2] >= 0.0)
        return;
    parts.scale = -parts.scale;
    for (HVector& axis : parts.axis)
        axis = -axis;
}

HStatus badSpace(HSpace::Space space) {
    return {HStatus::kInvalidParameter,
            "space " + std::to_string(static_cast<int>(space)) + " is none of kTransform, kObject and kWorld"};
}

bool isSpace(HSpace::Space space) {
    return space == HSpace::kTransform || space == HSpace::kObject || space == HSpace::kWorld;
}

/// What getters and setters of three numbers refuse.
HStatus checkTriple(const double* values, HSpace::Space space) {
    if (!values)
        return {HStatus::kInvalidParameter, "null instead of an array of three doubles"};
    return isSpace(space) ? HStatus(HStatus::kSuccess) : badSpace(space);
}

HStatus readTriple(const HVector& from, double* values, HSpace::Space space) {
    HStatus status = checkTriple(values, space);
    for (unsigned i = 0; i < 3 && !status.error(); ++i)
        values[i] = from[i];
    return status;
}

HStatus writeTriple(HVector& to, const double* values, HSpace::Space space) {
    HStatus status = checkTriple(values, space);
    if (!status.error())
        to = {values[0], values[1], values[2]};
    return status;
}

} // namespace

HTransformationMatrix::HTransformationMatrix(const HMatrix& matrix) noexcept {
    Parts parts;
    for (unsigned i = 0; i < 3; ++i)
        splitRow(parts, i, matrix.row(i));
    completeAxes(parts);
    makeProper(parts);
    scale_ = parts.scale;
    shear_ = {parts.shear[1][0], parts.shear[2][0], parts.shear[2][1]};
    for (unsigned i = 0; i < 3; ++i)
        rotation_.setRow(i, parts.axis[i]);
    translation_ = matrix.row(3);
}

HMatrix HTransformationMatrix::linear() const noexcept {
    const HVector r0 = rotation_.row(0);
    const HVector r1 = rotation_.row(1);
    const HVector r2 = rotation_.row(2);
    HMatrix result;
    result.setRow(0, scale_.x * r0);
    result.setRow(1, scale_.y * (shear_.x * r0 + r1));
    result.setRow(2, scale_.z * (shear_.y * r0 + shear_.z * r1 + r2));
    return result;
}

HMatrix HTransformationMatrix::asMatrix() const noexcept {
    HMatrix result = linear();
    result.setRow(3, translation_);
    return result;
}

HVector HTransformationMatrix::translation(HSpace::Space space, HStatus* status) const noexcept {
    return apiValue(Operation::HTransformationMatrix_translation, status, HVector(), [&](HStatus& outcome) {
        if (space != HSpace::kObject) {
            outcome = isSpace(space) ? HStatus(HStatus::kSuccess) : badSpace(space);
            return outcome.error() ? HVector() : translation_;
        }
        HMatrix inverse;
        if (!OpenQuarn::invertMatrix(linear(), inverse))
            outcome = {HStatus::kFailure, "scale, shear and rotation are singular: no offset in object space"};
        return outcome.error() ? HVector() : translation_ * inverse;
    });
}

HStatus HTransformationMatrix::setTranslation(const HVector& translation, HSpace::Space space) noexcept {
    return apiCall(Operation::HTransformationMatrix_setTranslation, [&]() -> HStatus {
        if (!isSpace(space))
            return badSpace(space);
        translation_ = space == HSpace::kObject ? translation * linear() : translation;
        return HStatus::kSuccess;
    });
}

HStatus HTransformationMatrix::getScale(double scale[3], HSpace::Space space) const noexcept {
    return apiCall(Operation::HTransformationMatrix_getScale, [&] { return readTriple(scale_, scale, space); });
}

HStatus HTransformationMatrix::setScale(const double scale[3], HSpace::Space space) noexcept {
    return apiCall(Operation::HTransformationMatrix_setScale, [&] { return writeTriple(scale_, scale, space); });
}

HStatus HTransformationMatrix::getShear(double shear[3], HSpace::Space space) const noexcept {
    return apiCall(Operation::HTransformationMatrix_getShear, [&] { return readTriple(shear_, shear, space); });
}

HStatus HTransformationMatrix::setShear(const double shear[3], HSpace::Space space) noexcept {
    return apiCall(Operation::HTransformationMatrix_setShear, [&] { return writeTriple(shear_, shear, space); });
}

HQuaternion HTransformationMatrix::rotation() const noexcept {
    return HQuaternion::fromMatrix(rotation_);
}

HEulerRotation HTransformationMatrix::eulerRotation() const noexcept {
    return HEulerRotation::fromMatrix(rotation_, order_);
}

void HTransformationMatrix::setRotation(const HQuaternion& rotation) noexcept {
    rotation_ = rotation.asMatrix();
}

void HTransformationMatrix::setRotation(const HEulerRotation& rotation) noexcept {
    rotation_ = rotation.asMatrix();
    order_ = rotation.order;
}

HStatus HTransformationMatrix::reorderRotation(HEulerRotation::RotationOrder order) noexcept {
    return apiCall(Operation::HTransformationMatrix_reorderRotation, [&]() -> HStatus {
        if (order < HEulerRotation::kXYZ || order > HEulerRotation::kZYX)
            return {HStatus::kInvalidParameter,
                    "rotation order " + std::to_string(static_cast<int>(order)) + " is none of the six (0 to 5)"};
        order_ = order;
        return HStatus::kSuccess;
    });
}
