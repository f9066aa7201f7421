// SPDX-License-Identifier: Apache-2.0
// Reading meshes, and moving their points.
#pragma once

#include "openquarn/HFloatArray.h"
#include "openquarn/HFnBase.h"
#include "openquarn/HIntArray.h"
#include "openquarn/HPointArray.h"

/// The polygons and points of a mesh. Meshes have no transformation: object space is the only one. A mesh is a value
/// that never changes: setPoints() and setUVs() attach the set to a new one.
class OPENQUARN_API HFnMesh : public HFnBase {
public:
    HFnMesh() = default;
    /// `mesh` mesh data, or a mesh node, whose output is evaluated: the set is attached to the data that it gives, and
    /// setting points reaches the node only when that is set into its plug. Fails with kInvalidParameter when it is
    /// neither, with kFailure when the node holds no mesh. Mesh data [any], a node [eval]
    explicit HFnMesh(const HObject& mesh, HStatus* status = nullptr);
    /// setObject() takes mesh data.
    HFn::Type type() const override { return HFn::kMeshData; }

    /// Each 0, and a failure, when nothing is attached. [any]
    int numVertices(HStatus* status = nullptr) const;
    int numPolygons(HStatus* status = nullptr) const;
    /// The vertices of a polygon in winding order; `vertices` is replaced. Fails with kInvalidParameter when
    /// `polygon` is not from 0 to numPolygons() - 1. [any]
    HStatus getPolygonVertices(int polygon, HIntArray& vertices) const;
    /// Positions of all vertices, object space, w = 1; `points` is replaced. [any]
    HStatus getPoints(HPointArray& points) const;
    /// Texture coordinates, v up, by corner: corner c, counted over all polygons, has (us[i], vs[i]) with i =
    /// corners[c], so that a vertex at a seam has several. All three are replaced, and empty where the mesh has none.
    /// [any]
    HStatus getUVs(HFloatArray& us, HFloatArray& vs, HIntArray& corners) const;
    /// Attaches the set to a mesh with these, that shares all else with the one before; three empty lists take them
    /// away. Deformers pass them on. Fails with kInvalidParameter, naming the value, when there are not as many `us` as
    /// `vs`, one is not finite, or `corners` are not as many as the polygons', each from 0 to us.length() - 1. [any]
    HStatus setUVs(const HFloatArray& us, const HFloatArray& vs, const HIntArray& corners);
    /// Attaches the set to a mesh with these points, object space, that shares polygons, UVs and component tags with
    /// the one before. Fails with kInvalidParameter when there are not numVertices() of them. [any]
    HStatus setPoints(const HPointArray& points);
};
