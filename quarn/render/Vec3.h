// SPDX-License-Identifier: Apache-2.0
// Points, directions and linear colours of the tracer, in single precision.
#pragma once

#include <cmath>

namespace quarn {

struct Vec3 {
    float x = 0.0F;
    float y = 0.0F;
    float z = 0.0F;

    Vec3& operator+=(const Vec3& other) {
        x += other.x;
        y += other.y;
        z += other.z;
        return *this;
    }
};

inline Vec3 operator+(const Vec3& a, const Vec3& b) {
    return {a.x + b.x, a.y + b.y, a.z + b.z};
}
inline Vec3 operator-(const Vec3& a, const Vec3& b) {
    return {a.x - b.x, a.y - b.y, a.z - b.z};
}
inline Vec3 operator-(const Vec3& a) {
    return {-a.x, -a.y, -a.z};
}
inline Vec3 operator*(const Vec3& a, float factor) {
    return {a.x * factor, a.y * factor, a.z * factor};
}
/// Of colours: channel by channel.
inline Vec3 operator*(const Vec3& a, const Vec3& b) {
    return {a.x * b.x, a.y * b.y, a.z * b.z};
}
inline float dot(const Vec3& a, const Vec3& b) {
    return a.x * b.x + a.y * b.y + a.z * b.z;
}
inline Vec3 cross(const Vec3& a, const Vec3& b) {
    return {a.y * b.z - a.z * b.y, a.z * b.x - a.x * b.z, a.x * b.y - a.y * b.x};
}
/// The zero vector stays.
inline Vec3 normalized(const Vec3& a) {
    const float length = std::sqrt(dot(a, a));
    return length > 0.0F ? a * (1.0F / length) : Vec3();
}
inline Vec3 mix(const Vec3& a, const Vec3& b, float part) {
    return a + (b - a) * part;
}

} // namespace quarn
