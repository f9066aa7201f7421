// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstddef>
#include <cstdint>
#include <vector>

namespace quill {

// The largest distance between the places of a vertex and of a neighbour. placeOf: empty, or [vertices].
std::size_t farthestNeighbour(const std::vector<std::uint32_t>& neighbours, const std::vector<std::uint32_t>& indexer,
                              const std::vector<std::uint32_t>& placeOf);

// All vertices in an order in which neighbours are near each other (reverse Cuthill-McKee: Cuthill and McKee, Reducing
// the bandwidth of sparse symmetric matrices, 1969; George, 1971). Those from indexer's end on follow at the end.
//   neighbours, indexer  checked tables: every neighbour has a place in indexer
//   vertexCount          of the order, at least the number of vertices in the tables
std::vector<std::uint32_t> nearOrder(const std::vector<std::uint32_t>& neighbours,
                                     const std::vector<std::uint32_t>& indexer, std::size_t vertexCount);

} // namespace quill
