// SPDX-License-Identifier: Apache-2.0
#include "quarn/pose/SceneFrames.h"

#include <algorithm>
#include <cmath>
#include <limits>
#include <utility>

namespace quarn {
namespace {

bool changesNothing(const std::vector<std::int32_t>& sceneVertexOf) {
    for (std::size_t vertex = 0; vertex < sceneVertexOf.size(); ++vertex)
        if (static_cast<std::size_t>(sceneVertexOf[vertex]) != vertex)
            return false;
    return true;
}

} // namespace

SceneFrames::SceneFrames(std::unique_ptr<storage::PointCache> cache, CacheSpace space)
    : cache_(std::move(cache))
    , space_(std::move(space)) {}

void SceneFrames::reorder(std::vector<std::int32_t> sceneVertexOf, std::size_t sceneVertices) {
    sceneVertexOf_ = changesNothing(sceneVertexOf) ? std::vector<std::int32_t>() : std::move(sceneVertexOf);
    first_.assign(sceneVertices, sceneVertexOf_.size());
    for (std::size_t vertex = sceneVertexOf_.size(); vertex-- > 0;)
        first_[static_cast<std::size_t>(sceneVertexOf_[vertex])] = vertex;
}

std::size_t SceneFrames::vertexCount() const {
    return sceneVertexOf_.empty() ? cache_->vertexCount() : first_.size();
}

void SceneFrames::read(std::size_t frame, std::vector<double>& xyz) {
    readUnchanged(frame, xyz);
    if (change_.isInPlace() && change_.order.empty())
        return;
    const std::vector<double> unchanged = xyz;
    for (std::size_t vertex = 0; 3 * vertex < xyz.size(); ++vertex) {
        const FitPoint point = change_.of(unchanged, vertex);
        std::copy(point.begin(), point.end(), xyz.begin() + static_cast<std::ptrdiff_t>(3 * vertex));
    }
}

void SceneFrames::readUnchanged(std::size_t frame, std::vector<double>& xyz) {
    std::vector<double>& points = sceneVertexOf_.empty() ? xyz : filePoints_;
    points.resize(3 * cache_->vertexCount());
    cache_->read(frame, 0, points);
    space_.toScene(points);
    if (sceneVertexOf_.empty())
        return;
    takeFirsts(xyz);
    measure(xyz);
}

void SceneFrames::takeFirsts(std::vector<double>& xyz) const {
    xyz.resize(3 * first_.size());
    for (std::size_t i = 0; i < xyz.size(); ++i)
        xyz[i] = filePoints_[3 * first_[i / 3] + i % 3];
}

void SceneFrames::measure(const std::vector<double>& xyz) {
    for (std::size_t vertex = 0; vertex < sceneVertexOf_.size(); ++vertex) {
        const auto scene = static_cast<std::size_t>(sceneVertexOf_[vertex]);
        if (first_[scene] == vertex)
            continue;
        const double* a = &xyz[3 * scene];
        const double* b = &filePoints_[3 * vertex];
        const double distance = std::hypot(a[0] - b[0], a[1] - b[1], a[2] - b[2]);
        largest_ = std::isnan(distance) ? std::numeric_limits<double>::infinity() : std::max(largest_, distance);
    }
}

} // namespace quarn
