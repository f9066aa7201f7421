// SPDX-License-Identifier: Apache-2.0
// What one blend shape does to a geometry: how far it moves the vertices that it moves.
#pragma once

#include "openquarn/HStatus.h"

#include <cstddef>
#include <cstdint>
#include <vector>

namespace rig {

/// Deltas in object space, in units of the geometry.
struct ShapeDeltas {
    std::vector<std::uint32_t> vertices; ///< ascending, none twice
    std::vector<double> xyz;             ///< [3 * vertices.size()]

    std::size_t count() const { return vertices.size(); }
    /// The least number of vertices that the geometry has to have.
    std::size_t extent() const { return vertices.empty() ? 0 : std::size_t{vertices.back()} + 1; }
};

/// Makes `shape` of lists that are not trusted, in any order: `vertices` the vertex of each delta, `deltas` x, y and z
/// of each. Without `vertices` the deltas are those of vertices 0, 1, 2 and so on. Fails, and leaves `shape` alone,
/// naming list, position and value: an index that is no whole number from 0 to 2^32 - 1 or is there twice, a delta that
/// is not finite, lists of lengths that do not fit. Takes memory by the length of the lists; throws std::bad_alloc.
/// [any]
HStatus makeShapeDeltas(const std::vector<double>& vertices, const std::vector<double>& deltas, ShapeDeltas& shape);

} // namespace rig
