// SPDX-License-Identifier: Apache-2.0
#include "quarn/fit/restOrder.h"

#include "quarn/fit/NearestPoint.h"

#include <algorithm>
#include <array>
#include <cmath>
#include <numeric>
#include <stdexcept>

namespace quarn {
namespace {

double distance(std::span<const double> a, std::span<const double> b) {
    return std::hypot(a[0] - b[0], a[1] - b[1], a[2] - b[2]);
}

[[noreturn]] void refuseTwo(std::size_t first, std::size_t second, std::size_t scene, const std::string& meshName) {
    throw std::runtime_error("vertices " + std::to_string(first) + " and " + std::to_string(second) +
                             " of the cache are both nearest to vertex " + std::to_string(scene) + " of " + meshName +
                             " in its rest pose: the cache is not at rest in that frame, or in "
                             "another space or unit (--rest-frame, --axes, --scale)");
}

constexpr auto none = static_cast<std::size_t>(-1);

/// Of each vertex, the next one that is in exactly its place; none for the last one there.
std::vector<std::size_t> nextInPlace(std::span<const double> xyz) {
    std::vector<std::size_t> order(xyz.size() / 3);
    std::iota(order.begin(), order.end(), std::size_t{0});
    const auto place = [&](std::size_t vertex) {
        return std::array{xyz[3 * vertex], xyz[3 * vertex + 1], xyz[3 * vertex + 2]};
    };
    std::stable_sort(order.begin(), order.end(), [&](std::size_t a, std::size_t b) { return place(a) < place(b); });
    std::vector<std::size_t> next(order.size(), none);
    for (std::size_t i = 1; i < order.size(); ++i)
        if (place(order[i - 1]) == place(order[i]))
            next[order[i - 1]] = order[i];
    return next;
}

} // namespace

RestMatch matchByRest(std::span<const double> cache, std::span<const double> rest, const std::string& meshName) {
    if (cache.size() != rest.size())
        throw std::runtime_error("the cache has " + std::to_string(cache.size() / 3) + " vertices, and " + meshName +
                                 " has " + std::to_string(rest.size() / 3));
    RestMatch match;
    if (rest.empty())
        return match;
    if (const auto bad = std::find_if_not(cache.begin(), cache.end(), [](double x) { return std::isfinite(x); });
        bad != cache.end())
        throw std::runtime_error("vertex " + std::to_string((bad - cache.begin()) / 3) +
                                 " of the cache has a coordinate that is no finite number where it is to be at rest");
    const NearestPoint points(rest);
    const std::vector<std::size_t> next = nextInPlace(rest);
    std::vector<std::size_t> cacheVertexOf(rest.size() / 3, none);
    for (std::size_t vertex = 0; 3 * vertex < cache.size(); ++vertex) {
        const std::span<const double> point = cache.subspan(3 * vertex, 3);
        const std::size_t nearest = points.nearest(point);
        std::size_t scene = nearest; // the first in its place
        while (scene != none && cacheVertexOf[scene] != none)
            scene = next[scene];
        if (scene == none)
            refuseTwo(cacheVertexOf[nearest], vertex, nearest, meshName);
        if (scene != nearest && !match.guessed)
            match.guessed = {nearest, scene};
        cacheVertexOf[scene] = vertex;
        match.sceneVertexOf.push_back(static_cast<std::int32_t>(scene));
        match.largestDistance = std::max(match.largestDistance, distance(point, rest.subspan(3 * scene, 3)));
    }
    return match;
}

} // namespace quarn
