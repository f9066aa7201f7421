// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "quill/VertexConnections.h"
#include "quill/VertexFrames.h"

#include <vector>

// The fixed yardstick: what one writes first, loop by loop, on the same tables and in the same oneTBB loop shape
// (blocked_range<int>, grain 1, auto_partitioner). Not to be improved when the library is.
namespace plain {

using Points = std::vector<quill::val3<float>>;

void smoothingPass(const Points& source, Points& destination, const std::vector<std::uint32_t>& indexer,
                   const std::vector<std::uint32_t>& connections, const std::vector<float>& weights);

void connectionWeights(std::vector<float>& weights, const Points& points, const std::vector<std::uint32_t>& indexer,
                       const std::vector<std::uint32_t>& connections);

void frames(std::vector<quill::mat4d>& out, const Points& points, const std::vector<std::uint32_t>& indexer,
            const std::vector<std::uint32_t>& pairs, bool invert);

void transformPoints(Points& points, const quill::mat4d& matrix);

void invertFrames(std::vector<quill::mat4d>& frames);

void toFloats(const std::vector<quill::mat4d>& frames, std::vector<float>& out);

// One node-based set per vertex; gives the total number of neighbours.
std::size_t adjacencyBySets(const quill::MeshTopology& topology, std::size_t vertexCount);

} // namespace plain
