// SPDX-License-Identifier: Apache-2.0
// Geometry of the host, as the numeric code takes it: single precision, in affected index space.
#pragma once

#include "deformer/neuralWarpData.h"
#include "openquarn/HDataBlock.h"
#include "openquarn/HDoubleArray.h"
#include "openquarn/HIndexMapper.h"
#include "quill/MeshTopology.h"

class HFnMesh;

namespace neuralWarp {

/// The rest geometry of a geometry (originalGeometry[multiIndex]), and the geometry as it comes in
/// (input[multiIndex].inputGeometry), evaluated. Invalid, with the host's failing status, when it is not there. Throw
/// std::runtime_error when the host does not know the attribute. [eval]
HDataHandle restGeometryHandle(HDataBlock& block, std::uint32_t multiIndex, HStatus& status);
HDataHandle inputGeometryHandle(HDataBlock& block, std::uint32_t multiIndex, HStatus& status);

/// The affected points of a geometry, object space, narrowed to float. False, and `points` is left as it is, when the
/// geometry has fewer vertices than `map`; its further vertices are ignored. [eval]
bool readGeometryPoints(const HDataHandle& geometry, Points& points, const quill::IndexMapper& map);

/// The same for a handle that must hold a mesh, smoothed by the settings in force if `smooth` says so. The failing
/// status of the mesh is reported and returned. A mesh that is too small leaves `points` as it is, with success. Throws
/// quill::Cancelled when the user has asked for the end of a long smoothing. [eval]
HStatus readMeshPoints(const HDataHandle& geometry, const neuralWarpData& data, Points& points, bool smooth);

/// The polygons of a mesh; those that the host does not give are left out. Fails, and `topology` is not valid, when the
/// host does not say how many there are. [any]
HStatus readMeshTopology(const HFnMesh& mesh, quill::MeshTopology& topology);

/// The corner pairs of the affected vertices, chosen by their rest points. The user is told beforehand of a polygon
/// that takes long; throws quill::Cancelled when they ask for the end meanwhile. [eval]
void buildFrames(quill::VertexFrames& frames, const quill::MeshTopology& topology, const quill::IndexMapper& map,
                 const Points& restPoints, const HString& nodeName);

/// The host's map of the affected vertices, in the same order. [any]
quill::IndexMapper readIndexMap(const HIndexMapper& mapper);

/// x, y, z of each delta, widened. Empty when there is no memory. [any]
HDoubleArray convertDeltasToHDoubleArray(const Points& deltas);

} // namespace neuralWarp
