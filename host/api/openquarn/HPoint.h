// SPDX-License-Identifier: Apache-2.0
// A position in homogeneous coordinates. Row vector; the call that hands one over says its space.
#pragma once

#include "openquarn/HVector.h"

/// Four doubles; w is 1 for an ordinary point and is carried along, not divided by, unless a call says so. Trivially
/// copyable. `[any]` throughout.
class HPoint {
public:
    double x = 0.0;
    double y = 0.0;
    double z = 0.0;
    double w = 1.0;

    constexpr HPoint() noexcept = default;
    constexpr HPoint(double xx, double yy, double zz = 0.0, double ww = 1.0) noexcept
        : x(xx)
        , y(yy)
        , z(zz)
        , w(ww) {}
    /// The point that lies `vector` away from the origin.
    constexpr explicit HPoint(const HVector& vector) noexcept
        : x(vector.x)
        , y(vector.y)
        , z(vector.z) {}
    /// x, y and z, whatever w is.
    constexpr explicit operator HVector() const noexcept { return {x, y, z}; }

    /// Component 0, 1, 2 or 3; any other index counts as 3.
    constexpr double& operator[](unsigned index) noexcept {
        return index == 0 ? x : index == 1 ? y : index == 2 ? z : w;
    }
    constexpr double operator[](unsigned index) const noexcept {
        return index == 0 ? x : index == 1 ? y : index == 2 ? z : w;
    }

    /// Moved by a vector; w stays.
    constexpr HPoint operator+(const HVector& offset) const noexcept {
        return {x + offset.x, y + offset.y, z + offset.z, w};
    }
    constexpr HPoint operator-(const HVector& offset) const noexcept {
        return {x - offset.x, y - offset.y, z - offset.z, w};
    }
    constexpr HPoint& operator+=(const HVector& offset) noexcept { return *this = *this + offset; }
    constexpr HPoint& operator-=(const HVector& offset) noexcept { return *this = *this - offset; }
    /// The vector from `other` to this, from x, y and z whatever the w are.
    constexpr HVector operator-(const HPoint& other) const noexcept { return {x - other.x, y - other.y, z - other.z}; }
    /// x, y and z scaled about the origin; w stays.
    constexpr HPoint operator*(double factor) const noexcept { return {x * factor, y * factor, z * factor, w}; }
    constexpr HPoint operator/(double divisor) const noexcept { return {x / divisor, y / divisor, z / divisor, w}; }
    constexpr HPoint& operator*=(double factor) noexcept { return *this = *this * factor; }
    constexpr HPoint& operator/=(double divisor) noexcept { return *this = *this / divisor; }

    /// Exact comparison of all four components; see isEquivalent().
    constexpr bool operator==(const HPoint& other) const noexcept {
        return x == other.x && y == other.y && z == other.z && w == other.w;
    }
    constexpr bool operator!=(const HPoint& other) const noexcept { return !(*this == other); }
    /// True when the two are at most `tolerance` apart, w aside.
    bool isEquivalent(const HPoint& other, double tolerance = 1e-10) const noexcept {
        return distanceTo(other) <= tolerance;
    }

    /// From x, y and z whatever the w are.
    double distanceTo(const HPoint& other) const noexcept { return (*this - other).length(); }

    /// Divides by w, so that w is 1. A point at infinity (w = 0) stays as it is. Returns this.
    constexpr HPoint& cartesianize() noexcept { return w == 0.0 ? *this : *this = HPoint(x / w, y / w, z / w); }
};
