// SPDX-License-Identifier: Apache-2.0
// Deformers one after the other that run on the device without going through the host's memory in between.
#pragma once

#include "geometry/GeometryFilterState.h"
#include "gpu/GpuGeometry.h"
#include "graph/evaluation.h"

#include <memory>
#include <optional>
#include <vector>

namespace OpenQuarn {

/// One geometry of one deformer.
struct Link {
    std::shared_ptr<Node> node;
    std::shared_ptr<NodeData> data;
    unsigned index = 0;
    std::shared_ptr<GeometryState> state;
    std::shared_ptr<Slot> input, geometry, output; ///< input[index], its inputGeometry, outputGeom[index]
    std::shared_ptr<const IndexMap> affected;      ///< null until the mesh is known
    std::unique_ptr<ComputeClaim> claim;           ///< null for the one that is being computed anyway
    GpuGeometry& gpu() const;
};

/// Links, first to last, and the mesh that comes in. Every output but the last one's is read by the next link alone.
struct Chain {
    std::vector<Link> links;
    std::shared_ptr<MeshData> mesh;
};

/// The chain that ends with the geometry: as far up as deformers are ready for the device. Evaluates what comes before
/// it. None when the geometry itself has to be evaluated on the CPU. Thread: one that evaluates, which holds the lock
/// of the graph.
std::optional<Chain> findChain(NodeData& data, unsigned index);

/// The number that each priming attribute of a node has for a geometry, evaluated.
std::vector<std::optional<double>> primingValues(const NodeData& data, unsigned index);

/// The slot of an attribute that belongs to a geometry: the element of that index below an array. Null when there is
/// none.
std::shared_ptr<Slot> slotOfGeometry(const NodeData& data, const HObject& attribute, unsigned index);

} // namespace OpenQuarn
