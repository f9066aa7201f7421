// SPDX-License-Identifier: Apache-2.0
#include "rig/ShapeDeltas.h"

#include "rig/listChecks.h"

#include <algorithm>
#include <numeric>
#include <string>

namespace rig {
namespace {

HStatus checkLengths(std::size_t vertices, std::size_t numbers) {
    if (numbers % 3 != 0)
        return wrong("deltas has " + std::to_string(numbers) + " values, not three for each vertex");
    if (vertices > 0 && vertices != numbers / 3)
        return wrong("deltas has " + std::to_string(numbers) + " values; the " + std::to_string(vertices) +
                     " vertices need " + std::to_string(3 * vertices));
    return HStatus::kSuccess;
}

HStatus check(const std::vector<double>& vertices, const std::vector<double>& deltas) {
    HStatus status = checkLengths(vertices.size(), deltas.size());
    if (!status.error())
        status = checkIndices("vertices", vertices);
    return status.error() ? status : checkFinite("deltas", deltas);
}

/// Positions in the list by ascending vertex.
std::vector<std::size_t> orderOf(const std::vector<double>& vertices) {
    std::vector<std::size_t> order(vertices.size());
    std::iota(order.begin(), order.end(), std::size_t{0});
    std::sort(order.begin(), order.end(), [&](std::size_t a, std::size_t b) { return vertices[a] < vertices[b]; });
    return order;
}

ShapeDeltas sorted(const std::vector<double>& vertices, const std::vector<double>& deltas) {
    ShapeDeltas made;
    made.vertices.reserve(vertices.size());
    made.xyz.reserve(deltas.size());
    for (const std::size_t position : orderOf(vertices)) {
        made.vertices.push_back(static_cast<std::uint32_t>(vertices[position]));
        for (std::size_t axis = 0; axis < 3; ++axis)
            made.xyz.push_back(deltas[3 * position + axis]);
    }
    return made;
}

ShapeDeltas ofAllVertices(const std::vector<double>& deltas) {
    ShapeDeltas made;
    made.xyz = deltas;
    made.vertices.resize(deltas.size() / 3);
    std::iota(made.vertices.begin(), made.vertices.end(), 0U);
    return made;
}

} // namespace

HStatus makeShapeDeltas(const std::vector<double>& vertices, const std::vector<double>& deltas, ShapeDeltas& shape) {
    HStatus status = check(vertices, deltas);
    if (status.error())
        return status;
    ShapeDeltas made = vertices.empty() ? ofAllVertices(deltas) : sorted(vertices, deltas);
    const auto twice = std::adjacent_find(made.vertices.begin(), made.vertices.end());
    if (twice != made.vertices.end())
        return wrong("vertices has " + std::to_string(*twice) + " twice");
    shape = std::move(made);
    return HStatus::kSuccess;
}

} // namespace rig
