// SPDX-License-Identifier: Apache-2.0
#include "quarn/dataset/DeltaCarriers.h"

#include "quarn/scene/meshes.h"

#include <algorithm>
#include <numeric>

namespace quarn {
namespace {

using Point = quill::val3<float>;

quill::MeshTopology topologyOf(const MeshPolygons& polygons) {
    quill::MeshTopology topology;
    topology.vertexCount = static_cast<int>(polygons.vertexCount);
    topology.polygonCount = polygons.sizes.size();
    topology.polygonVertices = polygons.corners;
    topology.polygonOffsets.assign(1, 0);
    for (const std::uint32_t size : polygons.sizes)
        topology.polygonOffsets.push_back(topology.polygonOffsets.back() + size);
    topology.valid = true;
    return topology;
}

Point pointOf(std::span<const float> xyz, std::size_t vertex) {
    return {xyz[3 * vertex], xyz[3 * vertex + 1], xyz[3 * vertex + 2]};
}

} // namespace

Point DeltaCarrier::deltaTo(const Point& point) const {
    const Point away = point - origin;
    return {quill::dot(away, turn[0]), quill::dot(away, turn[1]), quill::dot(away, turn[2])};
}

DeltaCarriers::DeltaCarriers(const MeshPolygons& polygons, std::span<const float> rest, const quill::IndexMapper& map,
                             std::vector<std::uint32_t> vertices, std::vector<DeltaKind> kinds)
    : map_(map)
    , vertices_(std::move(vertices))
    , kinds_(std::move(kinds))
    , rest_(affected(rest))
    , restInverses_(kinds_.size())
    , carriers_(kinds_.size(), std::vector<DeltaCarrier>(vertices_.size())) {
    const quill::MeshTopology topology = topologyOf(polygons);
    connections_.build(topology, map_, 0, false);
    connections_.calculateConnectionWeights(weights_, rest_, 1.0, 0.0);
    frames_.build(topology, map_, &rest_);
    forEachSmoothing(rest_, [this](std::size_t kind, const Points& smoothed) {
        frames_.calculateFrames(scratch_, smoothed, map_, true, &vertices_);
        for (const std::uint32_t vertex : vertices_)
            restInverses_[kind].push_back(scratch_[vertex]);
    });
}

// smooths once, however many kinds there are
template <class Measure>
void DeltaCarriers::forEachSmoothing(Points points, const Measure& measure) {
    std::vector<std::size_t> order(kinds_.size());
    std::iota(order.begin(), order.end(), std::size_t{0});
    std::stable_sort(order.begin(), order.end(), [this](std::size_t a, std::size_t b) {
        return kinds_[a].smoothingIterations < kinds_[b].smoothingIterations;
    });
    Points scratch;
    int done = 0;
    for (const std::size_t kind : order) {
        const int passes = kinds_[kind].smoothingIterations - done;
        if (passes > 0)
            connections_.mushArray(points, scratch, static_cast<std::size_t>(passes), 1.0F, nullptr, &weights_, false);
        done = std::max(done, kinds_[kind].smoothingIterations);
        measure(kind, points);
    }
}

DeltaCarriers::Points DeltaCarriers::affected(std::span<const float> xyz) const {
    Points points(map_.affectCount());
    for (std::size_t k = 0; k < points.size(); ++k)
        points[k] = pointOf(xyz, map_.toFull(k));
    return points;
}

void DeltaCarriers::measure(std::span<const float> skin) {
    forEachSmoothing(affected(skin), [this](std::size_t kind, const Points& smoothed) { carry(kind, smoothed); });
}

void DeltaCarriers::carry(std::size_t kind, const Points& smoothed) {
    std::vector<DeltaCarrier>& carriers = carriers_[kind];
    if (kinds_[kind].mode == 0) {
        for (std::size_t k = 0; k < vertices_.size(); ++k)
            carriers[k] = {smoothed[vertices_[k]], {Point{1, 0, 0}, Point{0, 1, 0}, Point{0, 0, 1}}};
        return;
    }
    frames_.calculateFrames(scratch_, smoothed, map_, false, &vertices_);
    for (std::size_t k = 0; k < vertices_.size(); ++k) {
        // the road of quill::transportDelta() in one matrix
        const quill::mat4d road = restInverses_[kind][k] * scratch_[vertices_[k]];
        carriers[k].origin = quill::transformAsPoint(rest_[vertices_[k]], road);
        for (std::size_t row = 0; row < 3; ++row)
            carriers[k].turn[row] = {static_cast<float>(road(row, 0)), static_cast<float>(road(row, 1)),
                                     static_cast<float>(road(row, 2))};
    }
}

void DeltaCarriers::pick(std::span<const float> xyz, Points& points) const {
    points.clear();
    for (const std::uint32_t vertex : vertices_)
        points.push_back(pointOf(xyz, map_.toFull(vertex)));
}

} // namespace quarn
