// SPDX-License-Identifier: Apache-2.0
// Meshes as pieces of data.
#pragma once

#include "geometry/Positions.h"
#include "openquarn/HFloatArray.h"
#include "openquarn/HIntArray.h"
#include "openquarn/HPointArray.h"
#include "openquarn/HUintArray.h"
#include "types/Data.h"

#include <map>
#include <memory>
#include <string>
#include <vector>

namespace OpenQuarn {

/// The polygons of a mesh, each any number of corners from 2 on. The vertices of polygon p are corners[offsets[p]] to
/// corners[offsets[p + 1] - 1], in winding order; each is below vertexCount.
struct Topology {
    unsigned vertexCount = 0;
    std::vector<unsigned> offsets{0}; ///< number of polygons + 1
    std::vector<int> corners;

    std::size_t polygonCount() const { return offsets.size() - 1; }
    bool operator==(const Topology& other) const {
        return vertexCount == other.vertexCount && offsets == other.offsets && corners == other.corners;
    }
};

/// Named lists of vertices, each below the vertex count and none twice in a list.
using ComponentTags = std::map<std::string, std::shared_ptr<const HUintArray>>;

/// Texture coordinates by corner, not by vertex: at a seam the corners of one vertex have different ones.
struct UvSet {
    std::vector<float> uvs;   ///< u and v of each; finite
    std::vector<int> corners; ///< for every corner of the topology, which of them it has

    std::size_t count() const { return uvs.size() / 2; }
};

/// A mesh: four parts, each shared with the meshes that it was made from.
class MeshData final : public Data {
public:
    /// None null but `componentTags`, which may be: no tags; and `texture`: no UVs.
    MeshData(std::shared_ptr<const Topology> polygons, std::shared_ptr<const Positions> positions,
             std::shared_ptr<const ComponentTags> componentTags, std::shared_ptr<const UvSet> texture = nullptr)
        : topology(std::move(polygons))
        , points(std::move(positions))
        , tags(std::move(componentTags))
        , uvs(std::move(texture)) {}
    HFn::Type kind() const override { return HFn::kMeshData; }
    HFnData::Type dataType() const override { return HFnData::kMesh; }
    unsigned vertexCount() const { return topology->vertexCount; }
    /// Null when there is none of that name.
    std::shared_ptr<const HUintArray> tag(const std::string& name) const;
    /// The same mesh with these in the place of its points or tags. Not checked: as many points, tags within them.
    std::shared_ptr<MeshData> withPositions(std::shared_ptr<const Positions> positions) const;
    std::shared_ptr<MeshData> withComponentTags(std::shared_ptr<const ComponentTags> componentTags) const;

    const std::shared_ptr<const Topology> topology;
    const std::shared_ptr<const Positions> points;
    const std::shared_ptr<const ComponentTags> tags;
    const std::shared_ptr<const UvSet> uvs;
};

// The following throw std::invalid_argument with a sentence that names the value.

/// As HFnMeshData::create().
std::shared_ptr<MeshData> makeMesh(const HPointArray& points, const HIntArray& counts, const HIntArray& connects);
/// As HFnMesh::setPoints().
std::shared_ptr<MeshData> withPoints(const MeshData& mesh, const HPointArray& points);
/// As HFnGeometryData::setComponentTag().
std::shared_ptr<MeshData> withTag(const MeshData& mesh, const std::string& name, const HUintArray& vertices);
/// The same for all tags at once, in the place of those it has; no list is null.
std::shared_ptr<MeshData> withTags(const MeshData& mesh, const std::shared_ptr<const ComponentTags>& tags);
std::shared_ptr<MeshData> withoutTag(const MeshData& mesh, const std::string& name);
/// As HFnMesh::setUVs().
std::shared_ptr<MeshData> withUvs(const MeshData& mesh, const HFloatArray& us, const HFloatArray& vs,
                                  const HIntArray& corners);

/// `points` gets the right length; fails when there is no memory for it.
HStatus copyPoints(const Positions& from, HPointArray& points);

} // namespace OpenQuarn
