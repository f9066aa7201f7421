// SPDX-License-Identifier: Apache-2.0
// A rotation as three angles about the coordinate axes.
#pragma once

#include "openquarn/HMatrix.h"

class HQuaternion;

/// Angles in radians, counter-clockwise when looking down the axis at the origin, and the order in which the axes are
/// turned about: kXYZ turns about x first, then about the fixed y, then about the fixed z; for row vectors
/// R = Rx * Ry * Rz. Trivially copyable. `[any]` throughout.
class HEulerRotation {
public:
    enum RotationOrder : int { kXYZ = 0, kYZX, kZXY, kXZY, kYXZ, kZYX };

    double x = 0.0;
    double y = 0.0;
    double z = 0.0;
    RotationOrder order = kXYZ;

    constexpr HEulerRotation() noexcept = default;
    constexpr HEulerRotation(double xx, double yy, double zz, RotationOrder rotationOrder = kXYZ) noexcept
        : x(xx)
        , y(yy)
        , z(zz)
        , order(rotationOrder) {}

    /// Angle about axis 0, 1 or 2; any other index counts as 2.
    constexpr double& operator[](unsigned axis) noexcept { return axis == 0 ? x : axis == 1 ? y : z; }
    constexpr double operator[](unsigned axis) const noexcept { return axis == 0 ? x : axis == 1 ? y : z; }

    /// The rotation matrix; no translation.
    OPENQUARN_API HMatrix asMatrix() const noexcept;
    /// The product of the three axis quaternions: it and its negative are the same rotation, and this one is continuous
    /// in the angles.
    OPENQUARN_API HQuaternion asQuaternion() const noexcept;

    /// The angles of a rotation matrix, whose first three rows must be orthonormal and right-handed. The middle angle
    /// is -pi/2 to pi/2, the others -pi to pi. In gimbal lock (the middle angle within 9e-16 of an
    /// end) only the sum or difference of the outer angles is determined: the angle of the last axis is then 0.
    OPENQUARN_API static HEulerRotation fromMatrix(const HMatrix& rotation, RotationOrder order = kXYZ) noexcept;

    /// The same rotation in another order; the same angles when the order is the same already.
    OPENQUARN_API HEulerRotation reorder(RotationOrder newOrder) const noexcept;
    /// Makes this its reorder(). Returns this.
    HEulerRotation& reorderIt(RotationOrder newOrder) noexcept { return *this = reorder(newOrder); }

    /// Exact comparison of angles and order; see isEquivalent().
    constexpr bool operator==(const HEulerRotation& other) const noexcept {
        return x == other.x && y == other.y && z == other.z && order == other.order;
    }
    constexpr bool operator!=(const HEulerRotation& other) const noexcept { return !(*this == other); }
    /// True when the orders are the same and no angle differs by more than `tolerance`.
    OPENQUARN_API bool isEquivalent(const HEulerRotation& other, double tolerance = 1e-10) const noexcept;
};
