// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cmath>
#include <cstddef>
#include <ostream>
#include <type_traits>

namespace quill {

/// A vector or point of three components, stored contiguously as x, y, z: an array of val3<float> is a packed run of
/// floats x0, y0, z0, x1, y1, z1, ... Every operation is carried out in the component type T, without fused steps.
/// No operation fails or throws; all are safe on any thread.
template <typename T>
struct val3 {
    static_assert(std::is_floating_point_v<T>);

    T x = 0;
    T y = 0;
    T z = 0;

    constexpr val3() = default;
    constexpr val3(T xIn, T yIn, T zIn)
        : x(xIn)
        , y(yIn)
        , z(zIn) {}

    /// Component 0, 1 or 2 (x, y, z). Any other index is a caller's error and reads z.
    constexpr T& operator[](std::size_t i) { return i == 0 ? x : i == 1 ? y : z; }
    constexpr const T& operator[](std::size_t i) const { return i == 0 ? x : i == 1 ? y : z; }

    constexpr val3& operator+=(const val3& b) {
        x += b.x;
        y += b.y;
        z += b.z;
        return *this;
    }
    constexpr val3& operator-=(const val3& b) {
        x -= b.x;
        y -= b.y;
        z -= b.z;
        return *this;
    }
    constexpr val3& operator*=(T s) {
        x *= s;
        y *= s;
        z *= s;
        return *this;
    }
    /// Divides each component (never by a reciprocal, which would round differently).
    constexpr val3& operator/=(T s) {
        x /= s;
        y /= s;
        z /= s;
        return *this;
    }

    friend constexpr val3 operator-(const val3& a) { return {-a.x, -a.y, -a.z}; }
    friend constexpr val3 operator+(val3 a, const val3& b) { return a += b; }
    friend constexpr val3 operator-(val3 a, const val3& b) { return a -= b; }
    friend constexpr val3 operator*(val3 a, T s) { return a *= s; }
    friend constexpr val3 operator*(T s, val3 a) { return a *= s; }
    friend constexpr val3 operator/(val3 a, T s) { return a /= s; }
    friend constexpr bool operator==(const val3& a, const val3& b) = default;

    constexpr T squaredLength() const { return x * x + y * y + z * z; }
    T length() const { return std::sqrt(squaredLength()); }

    /// Scales to unit length. A vector whose squared length is not above 1e-20 (in T) stays as it is, so that a zero
    /// vector never becomes NaN.
    void normalize() {
        const T s = squaredLength();
        if (s > static_cast<T>(1e-20))
            *this *= T(1) / std::sqrt(s);
    }
};

template <typename T>
constexpr T dot(const val3<T>& a, const val3<T>& b) {
    return a.x * b.x + a.y * b.y + a.z * b.z;
}

template <typename T>
constexpr val3<T> cross(const val3<T>& a, const val3<T>& b) {
    return {a.y * b.z - a.z * b.y, a.z * b.x - a.x * b.z, a.x * b.y - a.y * b.x};
}

template <typename T>
T length(const val3<T>& a) {
    return a.length();
}

/// True when |a - b| <= tolerance. NaN is equivalent to nothing.
constexpr bool equivalent(double a, double b, double tolerance) {
    const double difference = a - b;
    return difference <= tolerance && -difference <= tolerance;
}

/// Writes "[x, y, z]" in the stream's own number format.
template <typename T>
std::ostream& operator<<(std::ostream& out, const val3<T>& a) {
    return out << '[' << a.x << ", " << a.y << ", " << a.z << ']';
}

static_assert(sizeof(val3<float>) == 3 * sizeof(float) && std::is_trivially_copyable_v<val3<float>>);
static_assert(sizeof(val3<double>) == 3 * sizeof(double) && std::is_trivially_copyable_v<val3<double>>);

} // namespace quill
