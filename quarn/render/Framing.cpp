// SPDX-License-Identifier: Apache-2.0
#include "quarn/render/Framing.h"

#include <algorithm>
#include <limits>
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

Framing::Framing(const View& view, int width, int height, const Margins& margins)
    : view_(view) {
    const double tangent = std::tan(fieldOfView / 2.0 * std::numbers::pi / 180.0);
    const double shorter = std::min(width, height);
    tangentX_ = tangent * width / shorter;
    tangentY_ = tangent * height / shorter;
    tangents_ = {tangentX_ * (1.0 - 2.0 * margins.sides), tangentY_ * (1.0 - 2.0 * margins.top),
                 tangentY_ * (1.0 - 2.0 * margins.bottom)};
    reach_.fill(-std::numeric_limits<double>::infinity());
    nearest_ = -std::numeric_limits<double>::infinity();
    farthest_ = std::numeric_limits<double>::infinity();
}

void Framing::include(std::span<const double> xyz) {
    const auto [side, top, bottom] = tangents_;
    for (std::size_t at = 0; at + 2 < xyz.size(); at += 3) {
        const HVector point(xyz[at], xyz[at + 1], xyz[at + 2]);
        const double x = point * view_.right;
        const double y = point * view_.up;
        const double z = point * view_.viewer;
        reach_[0] = std::max(reach_[0], x + z * side);
        reach_[1] = std::max(reach_[1], -x + z * side);
        reach_[2] = std::max(reach_[2], y + z * top);
        reach_[3] = std::max(reach_[3], -y + z * bottom);
        nearest_ = std::max(nearest_, z);
        farthest_ = std::min(farthest_, z);
        empty_ = false;
    }
}

Camera Framing::camera() const {
    Camera camera;
    camera.view = view_;
    camera.tangentX = static_cast<float>(tangentX_);
    camera.tangentY = static_cast<float>(tangentY_);
    if (empty_) {
        camera.position = view_.viewer;
        return camera;
    }
    // at (x, y, z) everything is seen where x + z side >= reach right, -x + z side >= reach left, and the same for y
    const auto [side, top, bottom] = tangents_;
    const double middle = (nearest_ + farthest_) / 2.0;
    double z = std::max((reach_[0] + reach_[1]) / (2.0 * side), (reach_[2] + reach_[3]) / (top + bottom));
    // no point is nearer than a hundredth of the way; one point alone is seen from one unit away
    z = std::max(z, nearest_ + (nearest_ - farthest_) / 100.0);
    if (z - middle <= std::abs(middle) * 1e-12)
        z = middle + 1.0;
    const double x = (reach_[0] - reach_[1]) / 2.0;
    const double y = (reach_[2] - z * top + z * bottom - reach_[3]) / 2.0;
    camera.unit = z - middle;
    camera.position = view_.right * x + view_.up * y + view_.viewer * z;
    return camera;
}

} // namespace quarn
