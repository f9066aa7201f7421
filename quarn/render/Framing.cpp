// SPDX-License-Identifier: Apache-2.0
#include "quarn/render/Framing.h"

#include <algorithm>
#include <numbers>

namespace quarn {
namespace {

constexpr double fieldOfView = 35.0; // degrees

} // namespace

std::vector<Vec3> Camera::toCamera(std::span<const double> xyz) const {
    std::vector<Vec3> points(xyz.size() / 3);
    for (std::size_t vertex = 0; vertex < points.size(); ++vertex) {
        const HVector from = (HVector(xyz[3 * vertex], xyz[3 * vertex + 1], xyz[3 * vertex + 2]) - position) / unit;
        points[vertex] = {static_cast<float>(from * view.right), static_cast<float>(from * view.up),
                          static_cast<float>(from * view.viewer)};
    }
    return points;
}

Vec3 Camera::directionToCamera(const HVector& direction) const {
    return {static_cast<float>(direction * view.right), static_cast<float>(direction * view.up),
            static_cast<float>(direction * view.viewer)};
}

Framing::Framing(const View& view, int width, int height, const Margins& margins)
    : view_(view) {
    const double tangent = std::tan(fieldOfView / 2.0 * std::numbers::pi / 180.0);
    const double shorter = std::min(width, height);
    tangentX_ = tangent * width / shorter;
    tangentY_ = tangent * height / shorter;
    tangents_ = {tangentX_ * (1.0 - 2.0 * margins.sides), tangentY_ * (1.0 - 2.0 * margins.top),
                 tangentY_ * (1.0 - 2.0 * margins.bottom)};
}

void Framing::Reach::include(const Reach& other) {
    for (std::size_t side = 0; side < sides.size(); ++side)
        sides.at(side) = std::max(sides.at(side), other.sides.at(side));
    nearest = std::max(nearest, other.nearest);
    farthest = std::min(farthest, other.farthest);
}

Framing::Reach Framing::reachOf(const HVector& point) const {
    const auto [side, top, bottom] = tangents_;
    const double x = point * view_.right;
    const double y = point * view_.up;
    const double z = point * view_.viewer;
    return {{x + z * side, -x + z * side, y + z * top, -y + z * bottom}, z, z};
}

Camera Framing::camera(const Reach& reach) const {
    Camera camera;
    camera.view = view_;
    camera.tangentX = static_cast<float>(tangentX_);
    camera.tangentY = static_cast<float>(tangentY_);
    if (reach.isEmpty()) {
        camera.position = view_.viewer;
        return camera;
    }
    // at (x, y, z) everything is seen where x + z side >= reach right, -x + z side >= reach left, and the same for y
    const auto [side, top, bottom] = tangents_;
    const auto [right, left, up, down] = reach.sides;
    const double middle = (reach.nearest + reach.farthest) / 2.0;
    double z = std::max((right + left) / (2.0 * side), (up + down) / (top + bottom));
    // no point is nearer than a hundredth of the way; one point alone is seen from one unit away
    z = std::max(z, reach.nearest + (reach.nearest - reach.farthest) / 100.0);
    if (z - middle <= std::abs(middle) * 1e-12)
        z = middle + 1.0;
    const double x = (right - left) / 2.0;
    const double y = (up - z * top + z * bottom - down) / 2.0;
    camera.unit = z - middle;
    camera.position = view_.right * x + view_.up * y + view_.viewer * z;
    return camera;
}

} // namespace quarn
