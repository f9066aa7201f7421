// SPDX-License-Identifier: Apache-2.0
// A rotation as a quaternion.
#pragma once

#include "openquarn/HEulerRotation.h"

/// x, y, z times the imaginary units, and the real part w; the identity by default. A rotation by `angle` about a unit
/// axis a is a * sin(angle / 2), cos(angle / 2). p * q turns by p first, then by q, as with matrices. Trivially
/// copyable. `[any]` throughout.
class HQuaternion {
public:
    double x = 0.0;
    double y = 0.0;
    double z = 0.0;
    double w = 1.0;

    constexpr HQuaternion() noexcept = default;
    constexpr HQuaternion(double xx, double yy, double zz, double ww) noexcept
        : x(xx)
        , y(yy)
        , z(zz)
        , w(ww) {}
    /// The rotation by `angle` radians about `axis`, of any length; the identity about a zero axis.
    OPENQUARN_API HQuaternion(double angle, const HVector& axis) noexcept;

    /// The quaternion of a rotation matrix, whose first three rows must be orthonormal and right-handed; w is 0 or
    /// above.
    OPENQUARN_API static HQuaternion fromMatrix(const HMatrix& rotation) noexcept;

    /// The rotation matrix of the normalised quaternion; no translation.
    OPENQUARN_API HMatrix asMatrix() const noexcept;
    /// The angles of the normalised quaternion; see HEulerRotation::fromMatrix() for their ranges.
    OPENQUARN_API HEulerRotation
    asEulerRotation(HEulerRotation::RotationOrder order = HEulerRotation::kXYZ) const noexcept;

    /// This rotation, then `next`.
    constexpr HQuaternion operator*(const HQuaternion& next) const noexcept {
        return {w * next.x + x * next.w + z * next.y - y * next.z, w * next.y + y * next.w + x * next.z - z * next.x,
                w * next.z + z * next.w + y * next.x - x * next.y, w * next.w - x * next.x - y * next.y - z * next.z};
    }
    constexpr HQuaternion& operator*=(const HQuaternion& next) noexcept { return *this = *this * next; }
    /// The same rotation.
    constexpr HQuaternion operator-() const noexcept { return {-x, -y, -z, -w}; }
    /// The opposite rotation, of a unit quaternion.
    constexpr HQuaternion conjugate() const noexcept { return {-x, -y, -z, w}; }
    constexpr double dot(const HQuaternion& other) const noexcept {
        return x * other.x + y * other.y + z * other.z + w * other.w;
    }
    double length() const noexcept { return std::sqrt(dot(*this)); }

    /// Of length 1; the identity where the length is 0 or not finite.
    OPENQUARN_API HQuaternion normal() const noexcept;
    /// Makes this its normal(). Returns this.
    HQuaternion& normalizeIt() noexcept { return *this = normal(); }

    /// Spherical interpolation of two unit quaternions by the shorter way: `from` at `t` = 0, `to` or its negative at
    /// 1, at constant speed between and beyond.
    OPENQUARN_API static HQuaternion slerp(const HQuaternion& from, const HQuaternion& to, double t) noexcept;

    /// Exact comparison of the components; see isEquivalent().
    constexpr bool operator==(const HQuaternion& other) const noexcept {
        return x == other.x && y == other.y && z == other.z && w == other.w;
    }
    constexpr bool operator!=(const HQuaternion& other) const noexcept { return !(*this == other); }
    /// True when no component differs by more than `tolerance`.
    OPENQUARN_API bool isEquivalent(const HQuaternion& other, double tolerance = 1e-10) const noexcept;
};
