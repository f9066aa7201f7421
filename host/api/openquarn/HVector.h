// SPDX-License-Identifier: Apache-2.0
// A direction or a difference of positions. Row vector; no space of its own.
#pragma once

#include <cmath>

/// Three doubles; a translation does not move it. Trivially copyable. `[any]` throughout.
class HVector {
public:
    double x = 0.0;
    double y = 0.0;
    double z = 0.0;

    constexpr HVector() noexcept = default;
    constexpr HVector(double xx, double yy, double zz = 0.0) noexcept
        : x(xx)
        , y(yy)
        , z(zz) {}

    /// Component 0, 1 or 2; any other index counts as 2.
    constexpr double& operator[](unsigned index) noexcept { return index == 0 ? x : index == 1 ? y : z; }
    constexpr double operator[](unsigned index) const noexcept { return index == 0 ? x : index == 1 ? y : z; }

    constexpr HVector operator-() const noexcept { return {-x, -y, -z}; }
    constexpr HVector operator+(const HVector& other) const noexcept { return {x + other.x, y + other.y, z + other.z}; }
    constexpr HVector operator-(const HVector& other) const noexcept { return {x - other.x, y - other.y, z - other.z}; }
    constexpr HVector operator*(double factor) const noexcept { return {x * factor, y * factor, z * factor}; }
    constexpr HVector operator/(double divisor) const noexcept { return {x / divisor, y / divisor, z / divisor}; }
    constexpr HVector& operator+=(const HVector& other) noexcept { return *this = *this + other; }
    constexpr HVector& operator-=(const HVector& other) noexcept { return *this = *this - other; }
    constexpr HVector& operator*=(double factor) noexcept { return *this = *this * factor; }
    constexpr HVector& operator/=(double divisor) noexcept { return *this = *this / divisor; }

    /// Dot product.
    constexpr double operator*(const HVector& other) const noexcept { return x * other.x + y * other.y + z * other.z; }
    /// Cross product, right-handed: x ^ y = z.
    constexpr HVector operator^(const HVector& other) const noexcept {
        return {y * other.z - z * other.y, z * other.x - x * other.z, x * other.y - y * other.x};
    }

    /// Exact comparison of the components; see isEquivalent().
    constexpr bool operator==(const HVector& other) const noexcept {
        return x == other.x && y == other.y && z == other.z;
    }
    constexpr bool operator!=(const HVector& other) const noexcept { return !(*this == other); }
    /// True when the difference is at most `tolerance` long.
    bool isEquivalent(const HVector& other, double tolerance = 1e-10) const noexcept {
        return (*this - other).length() <= tolerance;
    }

    /// Euclidean length, also where the squares of the components leave the range of a double.
    double length() const noexcept {
        const double squared = *this * *this;
        return squared > 1e-280 && squared < 1e280 ? std::sqrt(squared) : std::hypot(x, y, z);
    }

    /// The vector of length 1 in this direction. A zero vector has none and is returned as it is; so is one that is
    /// infinite or not a number.
    HVector normal() const noexcept {
        const double size = length();
        return size > 0.0 && std::isfinite(size) ? *this / size : *this;
    }
    /// Makes this its normal(); a zero vector stays zero. Returns this.
    HVector& normalize() noexcept { return *this = normal(); }

    /// Angle to another vector, in radians, 0 to pi; 0 when either is zero.
    double angle(const HVector& other) const noexcept { return std::atan2((*this ^ other).length(), *this * other); }
};

constexpr HVector operator*(double factor, const HVector& vector) noexcept {
    return vector * factor;
}
