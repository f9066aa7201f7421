// SPDX-License-Identifier: Apache-2.0
// Evaluating the geometries of a filter.
#pragma once

#include "geometry/GeometryFilterState.h"
#include "openquarn/HPxGeometryFilter.h"

#include <optional>

namespace OpenQuarn {

/// The mesh of a slot after evaluating it; null when it holds none, and for a null slot. Thread: as below.
std::shared_ptr<MeshData> evaluatedMesh(const std::shared_ptr<Slot>& slot);

/// The part of a compound, or of an element of an array of compounds, that is the attribute's; null when there is none.
std::shared_ptr<Slot> childOf(const Slot& element, const Attribute& attribute);

/// What the first state of a geometry would be built from now, on a mesh with these polygons and tags that comes in;
/// evaluates its rest geometry. None, with a status that names node, geometry and tag, when the component tag is
/// unknown. Thread: as below.
std::optional<GeometrySources> sourcesOf(const NodeData& data, unsigned index, const Slot& input, const MeshData& mesh,
                                         HStatus& status);

/// Computes one element of outputGeom. Thread: one that evaluates, which holds the lock of the graph.
HStatus evaluateGeometry(HPxGeometryFilter& filter, NodeData& data, HDataBlock& block, unsigned index);

/// The vertices of a geometry that the filter affects, after evaluating its input; on no vertices when it has no mesh.
/// Null, with a status that names node, geometry and tag, when the component tag is unknown.
std::shared_ptr<const IndexMap> affectedVertices(const NodeData& data, unsigned index, HStatus& status);

} // namespace OpenQuarn
