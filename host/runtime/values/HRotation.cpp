// SPDX-License-Identifier: Apache-2.0
// Euler angles, quaternions and rotation matrices, each from the others.
//
// Euler angles in all six orders by one formula: the axes are renamed i, j, k in the order of turning, and for the odd
// orders all angles change sign (K. Shoemake, "Euler Angle Conversion", Graphics Gems IV). The last angle is taken from
// the matrix after the first has been turned back, so that the three together stay accurate close to gimbal lock.
// Quaternion of a matrix from its largest component (S. W. Shepperd, "Quaternion from Rotation Matrix", 1978); slerp
// after K. Shoemake, "Animating Rotation with Quaternion Curves", 1985.
#include "openquarn/HEulerRotation.h"
#include "openquarn/HQuaternion.h"

#include <cmath>
#include <limits>

namespace {

/// Axes in the order of turning, and the sign that makes them right-handed.
struct Axes {
    unsigned i, j, k;
    double parity;
};

Axes axesOf(HEulerRotation::RotationOrder order) {
    switch (order) {
    case HEulerRotation::kXYZ:
        break;
    case HEulerRotation::kYZX:
        return {1, 2, 0, 1.0};
    case HEulerRotation::kZXY:
        return {2, 0, 1, 1.0};
    case HEulerRotation::kXZY:
        return {0, 2, 1, -1.0};
    case HEulerRotation::kYXZ:
        return {1, 0, 2, -1.0};
    case HEulerRotation::kZYX:
        return {2, 1, 0, -1.0};
    }
    return {0, 1, 2, 1.0};
}

bool close(double a, double b, double tolerance) {
    return std::abs(a - b) <= tolerance;
}

HQuaternion scaled(const HQuaternion& q, double factor) {
    return {q.x * factor, q.y * factor, q.z * factor, q.w * factor};
}

HQuaternion sum(const HQuaternion& p, const HQuaternion& q) {
    return {p.x + q.x, p.y + q.y, p.z + q.z, p.w + q.w};
}

/// Turns about a coordinate axis.
HQuaternion aboutAxis(unsigned axis, double angle) {
    const double sine = std::sin(angle / 2);
    return {axis == 0 ? sine : 0.0, axis == 1 ? sine : 0.0, axis == 2 ? sine : 0.0, std::cos(angle / 2)};
}

} // namespace

HMatrix HEulerRotation::asMatrix() const noexcept {
    const auto [i, j, k, parity] = axesOf(order);
    const HEulerRotation& angles = *this;
    const double si = std::sin(parity * angles[i]);
    const double ci = std::cos(angles[i]);
    const double sj = std::sin(parity * angles[j]);
    const double cj = std::cos(angles[j]);
    const double sk = std::sin(parity * angles[k]);
    const double ck = std::cos(angles[k]);
    HMatrix m;
    m[i][i] = cj * ck;
    m[i][j] = cj * sk;
    m[i][k] = -sj;
    m[j][i] = si * sj * ck - ci * sk;
    m[j][j] = si * sj * sk + ci * ck;
    m[j][k] = si * cj;
    m[k][i] = ci * sj * ck + si * sk;
    m[k][j] = ci * sj * sk - si * ck;
    m[k][k] = ci * cj;
    return m;
}

HEulerRotation HEulerRotation::fromMatrix(const HMatrix& m, RotationOrder order) noexcept {
    constexpr double lock = 4 * std::numeric_limits<double>::epsilon(); // below it the outer axes cannot be told apart
    const auto [i, j, k, parity] = axesOf(order);
    const double cj = std::hypot(m[i][i], m[i][j]);
    const bool locked = cj <= lock;
    const double first = locked ? std::atan2(-m[k][j], m[j][j]) : std::atan2(m[j][k], m[k][k]);
    const double si = std::sin(first);
    const double ci = std::cos(first);
    HEulerRotation result(0.0, 0.0, 0.0, order);
    result[i] = parity * first;
    result[j] = parity * std::atan2(-m[i][k], cj);
    if (!locked)
        result[k] = parity * std::atan2(si * m[k][i] - ci * m[j][i], ci * m[j][j] - si * m[k][j]);
    return result;
}

HQuaternion HEulerRotation::asQuaternion() const noexcept {
    const Axes axes = axesOf(order);
    const HEulerRotation& angles = *this;
    return aboutAxis(axes.i, angles[axes.i]) * aboutAxis(axes.j, angles[axes.j]) * aboutAxis(axes.k, angles[axes.k]);
}

HEulerRotation HEulerRotation::reorder(RotationOrder newOrder) const noexcept {
    return newOrder == order ? *this : fromMatrix(asMatrix(), newOrder);
}

bool HEulerRotation::isEquivalent(const HEulerRotation& other, double tolerance) const noexcept {
    return order == other.order && close(x, other.x, tolerance) && close(y, other.y, tolerance) &&
           close(z, other.z, tolerance);
}

HQuaternion::HQuaternion(double angle, const HVector& axis) noexcept {
    const HVector unit = axis.normal();
    if (unit == HVector())
        return;
    const double sine = std::sin(angle / 2);
    *this = {unit.x * sine, unit.y * sine, unit.z * sine, std::cos(angle / 2)};
}

HQuaternion HQuaternion::fromMatrix(const HMatrix& m) noexcept {
    // four times the squares of the components, of which at least one is 1 or more
    const double ww = 1.0 + m[0][0] + m[1][1] + m[2][2];
    const double xx = 1.0 + m[0][0] - m[1][1] - m[2][2];
    const double yy = 1.0 - m[0][0] + m[1][1] - m[2][2];
    const double zz = 1.0 - m[0][0] - m[1][1] + m[2][2];
    const double wx = m[1][2] - m[2][1];
    const double wy = m[2][0] - m[0][2];
    const double wz = m[0][1] - m[1][0];
    const double xy = m[0][1] + m[1][0];
    const double yz = m[1][2] + m[2][1];
    const double zx = m[2][0] + m[0][2];
    HQuaternion q;
    if (ww >= xx && ww >= yy && ww >= zz)
        q = {wx, wy, wz, ww};
    else if (xx >= yy && xx >= zz)
        q = {xx, xy, zx, wx};
    else if (yy >= zz)
        q = {xy, yy, yz, wy};
    else
        q = {zx, yz, zz, wz};
    q.normalizeIt();
    return q.w < 0.0 ? -q : q;
}

HMatrix HQuaternion::asMatrix() const noexcept {
    const HQuaternion q = normal();
    HMatrix m;
    m.setRow(0, {1 - 2 * (q.y * q.y + q.z * q.z), 2 * (q.x * q.y + q.z * q.w), 2 * (q.x * q.z - q.y * q.w)});
    m.setRow(1, {2 * (q.x * q.y - q.z * q.w), 1 - 2 * (q.x * q.x + q.z * q.z), 2 * (q.y * q.z + q.x * q.w)});
    m.setRow(2, {2 * (q.x * q.z + q.y * q.w), 2 * (q.y * q.z - q.x * q.w), 1 - 2 * (q.x * q.x + q.y * q.y)});
    return m;
}

HEulerRotation HQuaternion::asEulerRotation(HEulerRotation::RotationOrder order) const noexcept {
    return HEulerRotation::fromMatrix(asMatrix(), order);
}

HQuaternion HQuaternion::normal() const noexcept {
    const double size = std::hypot(std::hypot(x, y), std::hypot(z, w));
    if (size == 0.0 || !std::isfinite(size))
        return {};
    return {x / size, y / size, z / size, w / size};
}

HQuaternion HQuaternion::slerp(const HQuaternion& from, const HQuaternion& to, double t) noexcept {
    const HQuaternion target = from.dot(to) < 0.0 ? -to : to;
    // half the angle between the two from chord and sum, which is accurate for small and large angles alike
    const double chord = sum(target, -from).length();
    const double angle = 2.0 * std::atan2(chord, sum(target, from).length());
    if (angle < 1e-8) // sin(s * angle) / sin(angle) is s up to rounding
        return sum(scaled(from, 1.0 - t), scaled(target, t)).normal();
    const double sine = std::sin(angle);
    return sum(scaled(from, std::sin((1.0 - t) * angle) / sine), scaled(target, std::sin(t * angle) / sine));
}

bool HQuaternion::isEquivalent(const HQuaternion& other, double tolerance) const noexcept {
    return close(x, other.x, tolerance) && close(y, other.y, tolerance) && close(z, other.z, tolerance) &&
           close(w, other.w, tolerance);
}
