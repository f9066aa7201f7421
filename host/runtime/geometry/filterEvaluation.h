// SPDX-License-Identifier: Apache-2.0
// Evaluating the geometries of a filter.
#pragma once

#include "geometry/GeometryFilterState.h"
#include "openquarn/HPxGeometryFilter.h"

namespace OpenQuarn {

/// Computes one element of outputGeom. Thread: one that evaluates, which holds the lock of the graph.
HStatus evaluateGeometry(HPxGeometryFilter& filter, NodeData& data, HDataBlock& block, unsigned index);

/// The vertices of a geometry that the filter affects, after evaluating its input; on no vertices when it has no mesh.
/// Null, with a status that names node, geometry and tag, when the component tag is unknown.
std::shared_ptr<const IndexMap> affectedVertices(const NodeData& data, unsigned index, HStatus& status);

} // namespace OpenQuarn
