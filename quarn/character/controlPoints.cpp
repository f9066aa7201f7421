// SPDX-License-Identifier: Apache-2.0
#include "quarn/character/controlPoints.h"

#include "quarn/character/colladaMeshes.h"
#include "quarn/character/fbxMeshes.h"

#include <algorithm>
#include <cmath>
#include <limits>
#include <stdexcept>

namespace quarn {
namespace {

/// Goes through the polygons of a control mesh and, side by side, through those of the importer's parts: which part the
/// next polygon lies in is seen by where its corners are.
class PolygonWalk {
public:
    PolygonWalk(const ControlMesh& control, const std::vector<ImportedPart>& parts)
        : control_(control)
        , parts_(parts)
        , done_(parts.size(), 0) {
        double largest = 0.0;
        for (const double coordinate : control.points)
            largest = std::max(largest, std::abs(coordinate));
        // the importer rounds to single precision, and a number in text up to some units of its last place
        tolerance_ = 1e-5 * largest;
    }

    /// The importer's vertex of each corner of the control mesh, counted over the parts; empty when they do not fit.
    std::vector<std::uint32_t> vertexOfCorners() {
        if (!haveEqualCounts())
            return {};
        std::vector<std::uint32_t> vertices;
        vertices.reserve(control_.corners.size());
        const std::uint32_t* corners = control_.corners.data();
        for (const std::uint32_t size : control_.polygonSizes) {
            if (!findPart(corners, size))
                return {};
            const aiFace& face = parts_[part_].mesh->mFaces[done_[part_]++];
            for (std::uint32_t c = 0; c < size; ++c)
                vertices.push_back(parts_[part_].firstVertex + face.mIndices[c]);
            corners += size;
        }
        return vertices;
    }

private:
    bool haveEqualCounts() const {
        std::size_t faces = 0;
        for (const ImportedPart& part : parts_)
            faces += part.mesh->mNumFaces;
        return faces == control_.polygonSizes.size();
    }
    // the one of the polygon before first: mostly it goes on
    bool findPart(const std::uint32_t* corners, std::uint32_t size) {
        for (std::size_t tried = 0; tried < parts_.size(); ++tried) {
            if (isNext(corners, size))
                return true;
            part_ = (part_ + 1) % parts_.size();
        }
        return false;
    }
    bool isNext(const std::uint32_t* corners, std::uint32_t size) const {
        const aiMesh& mesh = *parts_[part_].mesh;
        if (done_[part_] == mesh.mNumFaces || mesh.mFaces[done_[part_]].mNumIndices != size)
            return false;
        const aiFace& face = mesh.mFaces[done_[part_]];
        for (std::uint32_t c = 0; c < size; ++c)
            if (!isAt(mesh.mVertices[face.mIndices[c]], corners[c]))
                return false;
        return true;
    }
    bool isAt(const aiVector3D& place, std::uint32_t point) const {
        const double* p = control_.points.data() + 3 * std::size_t{point};
        return std::abs(static_cast<double>(place.x) - p[0]) <= tolerance_ &&
               std::abs(static_cast<double>(place.y) - p[1]) <= tolerance_ &&
               std::abs(static_cast<double>(place.z) - p[2]) <= tolerance_;
    }

    const ControlMesh& control_;
    const std::vector<ImportedPart>& parts_;
    std::vector<std::uint32_t> done_; ///< polygons of each part
    std::size_t part_ = 0;            ///< the last one's
    double tolerance_ = 0.0;
};

ControlPointMap joined(const ControlMesh& control, const std::vector<std::uint32_t>& vertexOfCorners,
                       const std::vector<std::uint32_t>& joinedOf) {
    constexpr std::uint32_t none = std::numeric_limits<std::uint32_t>::max();
    ControlPointMap map;
    map.vertexOf.assign(control.points.size() / 3, none);
    for (std::size_t i = 0; i < vertexOfCorners.size(); ++i) {
        std::uint32_t& vertex = map.vertexOf[control.corners[i]];
        const std::uint32_t here = joinedOf[vertexOfCorners[i]];
        if (vertex != none && vertex != here)
            return {{}, "has corners of control point " + std::to_string(control.corners[i]) + " that move apart"};
        vertex = here;
    }
    const auto loose = std::count(map.vertexOf.begin(), map.vertexOf.end(), none);
    if (loose == 0)
        return map;
    const auto first = std::find(map.vertexOf.begin(), map.vertexOf.end(), none) - map.vertexOf.begin();
    return {{},
            "has control points that are in no polygon, " + std::to_string(loose) + " of them, such as " +
                std::to_string(first)};
}

} // namespace

ControlPoints::ControlPoints(std::string_view bytes, const std::string& ending)
    : areCounted_(true) {
    try {
        meshes_ = ending == ".fbx" ? readFbxMeshes(bytes) : readColladaMeshes(bytes);
    } catch (const std::runtime_error& error) {
        problem_ = std::string("is in a file whose control points cannot be read: ") + error.what();
    }
    isTaken_.resize(meshes_.size());
}

ControlPointMap ControlPoints::mapOf(const std::vector<ImportedPart>& parts,
                                     const std::vector<std::uint32_t>& joinedOf) {
    if (!problem_.empty())
        return {{}, problem_};
    for (const bool again : {false, true}) // a mesh that stands at two nodes is taken twice
        for (std::size_t i = 0; i < meshes_.size(); ++i) {
            if (isTaken_[i] != again)
                continue;
            const std::vector<std::uint32_t> vertexOfCorners = PolygonWalk(meshes_[i], parts).vertexOfCorners();
            if (vertexOfCorners.empty())
                continue;
            isTaken_[i] = true;
            return joined(meshes_[i], vertexOfCorners, joinedOf);
        }
    return {{}, "has the polygons of none of the file's geometries"};
}

} // namespace quarn
