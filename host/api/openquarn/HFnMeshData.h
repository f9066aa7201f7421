// SPDX-License-Identifier: Apache-2.0
// Making meshes.
#pragma once

#include "openquarn/HFnGeometryData.h"
#include "openquarn/HIntArray.h"
#include "openquarn/HPointArray.h"

/// A piece of data that holds a mesh: the value of an attribute of type HFnData::kMesh.
class OPENQUARN_API HFnMeshData : public HFnGeometryData {
public:
    HFnMeshData() = default;
    /// Fails as setObject() does. [any]
    explicit HFnMeshData(const HObject& data, HStatus* status = nullptr);

    /// Makes a new mesh and attaches the set to it; null on failure. Everything is copied.
    /// `points` positions of the vertices, object space; w is dropped. A vertex may belong to no polygon.
    /// `polygonCounts` number of vertices of each polygon, at least 2 (an edge that bounds no face).
    /// `polygonConnects` the vertices of all polygons one after the other, each in winding order: as many as the counts
    /// add up to, each from 0 to points.length() - 1. A polygon may name a vertex more than once.
    /// Fails with kInvalidParameter, naming the value, otherwise. [any]
    HObject create(const HPointArray& points, const HIntArray& polygonCounts, const HIntArray& polygonConnects,
                   HStatus* status = nullptr);
};
