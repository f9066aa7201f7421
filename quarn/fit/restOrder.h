// SPDX-License-Identifier: Apache-2.0
// Caches with the scene's vertices in an order that nobody knows: their places in the rest pose tell it.
#pragma once

#include <cstddef>
#include <cstdint>
#include <optional>
#include <span>
#include <string>
#include <utility>
#include <vector>

namespace quarn {

/// Which vertex of the scene each one of a cache is.
struct RestMatch {
    std::vector<std::int32_t> sceneVertexOf; ///< by vertex of the cache; each vertex of the scene once
    double largestDistance = 0.0;            ///< of two vertices that are one
    /// The first two vertices of the scene that are in one place at rest: which of the cache's is which is taken from
    /// their order there.
    std::optional<std::pair<std::size_t, std::size_t>> guessed;
};

/// Matches each vertex of a cache with the vertex of the scene that is nearest in the rest pose. `cache` and `rest` x,
/// y, z of every vertex, in one space and unit; `rest` finite. Throws std::runtime_error, with `meshName`: with both
/// numbers of vertices where they differ, naming the vertex where a position of the cache is no finite number, and both
/// vertices where two of the cache are nearest to one of the scene with no other in its place. About n log n steps.
/// Thread: any.
RestMatch matchByRest(std::span<const double> cache, std::span<const double> rest, const std::string& meshName);

} // namespace quarn
