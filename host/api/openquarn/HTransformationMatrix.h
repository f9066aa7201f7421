// SPDX-License-Identifier: Apache-2.0
// A transformation as scale, shear, rotation and translation.
#pragma once

#include "openquarn/HEulerRotation.h"
#include "openquarn/HMatrix.h"
#include "openquarn/HQuaternion.h"
#include "openquarn/HSpace.h"

/// M = S * Sh * R * T for row vectors: scaled along the object's axes, then sheared, rotated and translated. With
/// scale s, shear (xy, xz, yz) and the rows r0, r1, r2 of R, the first three rows of M are
///     s.x * r0,    s.y * (xy * r0 + r1),    s.z * (xz * r0 + yz * r1 + r2).
///
/// Decomposing. R is always a proper rotation. The rows of M are made orthonormal one after the other; a mirroring
/// matrix (determinant below 0) has all three scales below 0, any other all three at 0 or above. Column 3 of the matrix
/// is not looked at: perspective is dropped.
///
/// Singular matrices give finite values, and asMatrix() gives the matrix back up to rounding (about 1e-15 of the
/// length of each row). A zero row has scale 0 and shears 0. A row that lies in the span of the rows before it, up to
/// rounding (9e-16 of its length), has the scale 2.2e-16 (2 to the power of -52) times its length, so that its shears
/// can carry it. Axes that the rows leave open are chosen so that R is proper. Rows with values that are infinite or
/// not a number have scales and shears that are not a number.
///
/// Trivially copyable. Of the spaces, scale and shear are the same in all: they act on the object's own axes.
/// `[any]` throughout.
class OPENQUARN_API HTransformationMatrix {
public:
    /// The identity, with rotation order kXYZ.
    HTransformationMatrix() noexcept = default;
    /// Decomposes; rotation order kXYZ.
    HTransformationMatrix(const HMatrix& matrix) noexcept; // NOLINT(google-explicit-constructor): the same in parts

    /// Recomposes M.
    HMatrix asMatrix() const noexcept;

    /// In kTransform and kWorld row 3 of M; in kObject the offset to make before the rest of M for the same result,
    /// which fails with kFailure (and a zero vector) when scale, shear and rotation together are singular.
    /// kInvalidParameter for any other space. `status` may be null.
    HVector translation(HSpace::Space space, HStatus* status = nullptr) const noexcept;
    HStatus setTranslation(const HVector& translation, HSpace::Space space) noexcept;

    /// `scale` of x, y and z, written on success. kInvalidParameter for null or kInvalid.
    HStatus getScale(double scale[3], HSpace::Space space) const noexcept;
    /// Any values. kInvalidParameter for null or kInvalid; the transformation then stays as it is.
    HStatus setScale(const double scale[3], HSpace::Space space) noexcept;

    /// `shear` xy, xz and yz, written on success. kInvalidParameter for null or kInvalid.
    HStatus getShear(double shear[3], HSpace::Space space) const noexcept;
    /// Any values. kInvalidParameter for null or kInvalid; the transformation then stays as it is.
    HStatus setShear(const double shear[3], HSpace::Space space) noexcept;

    /// A unit quaternion with w at 0 or above.
    HQuaternion rotation() const noexcept;
    /// In rotationOrder(); see HEulerRotation::fromMatrix() for the ranges of the angles.
    HEulerRotation eulerRotation() const noexcept;
    /// R alone.
    HMatrix asRotateMatrix() const noexcept { return rotation_; }
    /// Normalised first; the identity for a zero quaternion. The rotation order stays.
    void setRotation(const HQuaternion& rotation) noexcept;
    /// Takes over the rotation order too.
    void setRotation(const HEulerRotation& rotation) noexcept;

    HEulerRotation::RotationOrder rotationOrder() const noexcept { return order_; }
    /// Sets the order that eulerRotation() answers in; the rotation stays the same. kInvalidParameter for a value that
    /// is no order.
    HStatus reorderRotation(HEulerRotation::RotationOrder order) noexcept;

private:
    HMatrix linear() const noexcept;

    HVector scale_{1.0, 1.0, 1.0};
    HVector shear_; // xy, xz, yz
    HMatrix rotation_;
    HVector translation_; // row 3
    HEulerRotation::RotationOrder order_ = HEulerRotation::kXYZ;
};
