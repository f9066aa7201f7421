// SPDX-License-Identifier: Apache-2.0
// Each range of vertices adds up its own part of every shape, found by bisection: shapes are sorted by vertex. So each
// sum has one writer and one order, and a shape costs nothing where it moves nothing. Double precision throughout.
#include "rig/addShapes.h"

#include <oneapi/tbb/blocked_range.h>
#include <oneapi/tbb/parallel_for.h>
#include <oneapi/tbb/partitioner.h>

#include <algorithm>

namespace rig {
namespace {

using Range = tbb::blocked_range<std::size_t>;

// 24 KB of sums, which stay in the nearest cache while shape after shape is added
constexpr std::size_t smallestRange = 1024;

void addShape(const WeightedShape& shape, const Range& range, std::vector<double>& sums) {
    const std::vector<std::uint32_t>& vertices = shape.deltas->vertices;
    const auto first = std::lower_bound(vertices.begin(), vertices.end(), range.begin());
    const auto last = std::lower_bound(first, vertices.end(), range.end());
    const double* delta = shape.deltas->xyz.data() + 3 * (first - vertices.begin());
    for (auto vertex = first; vertex != last; ++vertex, delta += 3) {
        double* sum = sums.data() + std::size_t{3} * *vertex;
        for (std::size_t axis = 0; axis < 3; ++axis)
            sum[axis] += shape.weight * delta[axis];
    }
}

void movePoint(const ShapeTask& task, const std::vector<double>& sums, std::size_t i, HPoint& point) {
    const std::size_t vertex = task.vertices.isEmpty() ? i : task.vertices[i];
    const double factor = task.pointWeights ? task.envelope * static_cast<double>(task.pointWeights[i]) : task.envelope;
    const double* sum = sums.data() + 3 * vertex;
    point += HVector(sum[0], sum[1], sum[2]) * factor;
}

} // namespace

void addShapes(const ShapeTask& task, std::vector<double>& sums, HPointArray& points) {
    sums.resize(3 * task.vertexCount);
    const auto addAll = [&](const Range& range) {
        std::fill_n(sums.data() + 3 * range.begin(), 3 * range.size(), 0.0);
        for (const WeightedShape& shape : task.shapes)
            addShape(shape, range, sums);
    };
    tbb::parallel_for(Range(0, task.vertexCount, smallestRange), addAll, tbb::simple_partitioner());
    tbb::parallel_for(Range(0, points.length(), smallestRange), [&](const Range& range) {
        for (std::size_t i = range.begin(); i < range.end(); ++i)
            movePoint(task, sums, i, points[i]);
    });
}

} // namespace rig
