// SPDX-License-Identifier: Apache-2.0
#include "quarn/scene/meshes.h"

#include "openquarn/HDataBlock.h"
#include "openquarn/HFnGeometryData.h"
#include "openquarn/HFnMesh.h"
#include "openquarn/HFnMeshData.h"
#include "openquarn/HIntArray.h"
#include "openquarn/HItGeometry.h"
#include "openquarn/HPlug.h"
#include "openquarn/HPointArray.h"

#include <algorithm>
#include <cmath>
#include <stdexcept>

namespace quarn {
namespace {

void require(const HStatus& status, const HPlug& plug) {
    if (status.error())
        throw std::runtime_error(std::string(plug.name().asChar()) + ": " + status.errorString().asChar());
}

// the evaluated data of a plug, given back with its owner
class EvaluatedData {
public:
    explicit EvaluatedData(const HPlug& plug)
        : plug_(plug) {
        HStatus status;
        handle_ = plug.asHDataHandle(&status);
        require(status, plug);
    }
    ~EvaluatedData() { plug_.destructHandle(handle_); }
    EvaluatedData(const EvaluatedData&) = delete;
    EvaluatedData& operator=(const EvaluatedData&) = delete;
    const HDataHandle& handle() const { return handle_; }

private:
    HPlug plug_;
    HDataHandle handle_;
};

// `room(count)` where that many numbers go
template <class Number, class Room>
void read(const HPlug& mesh, const Room& room) {
    const EvaluatedData data(mesh);
    HStatus status;
    const HItGeometry geometry(data.handle(), &status);
    require(status, mesh);
    const double* from = geometry.rawPositions(&status);
    require(status, mesh);
    const std::size_t count = 3 * static_cast<std::size_t>(geometry.count());
    Number* to = room(count);
    std::transform(from, from + count, to, [](double value) { return static_cast<Number>(value); });
}

template <class Number>
void read(const HPlug& mesh, std::vector<Number>& xyz) {
    read<Number>(mesh, [&](std::size_t count) {
        xyz.resize(count);
        return xyz.data();
    });
}

void readUvs(const HFnMesh& mesh, const HPlug& plug, MeshPolygons& polygons) {
    HFloatArray us, vs;
    HIntArray corners;
    require(mesh.getUVs(us, vs, corners), plug);
    for (unsigned uv = 0; uv < us.length(); ++uv)
        polygons.uvs.insert(polygons.uvs.end(), {us[uv], vs[uv]});
    for (const int uv : corners)
        polygons.uvCorners.push_back(static_cast<std::uint32_t>(uv));
}

HStatus setUvs(HFnMesh mesh, const MeshPolygons& polygons, HObject& data) {
    HFloatArray us(static_cast<unsigned>(polygons.uvs.size() / 2)), vs(us.length());
    for (unsigned uv = 0; uv < us.length(); ++uv) {
        us[uv] = polygons.uvs[2 * std::size_t{uv}];
        vs[uv] = polygons.uvs[2 * std::size_t{uv} + 1];
    }
    HIntArray corners(static_cast<unsigned>(polygons.uvCorners.size()));
    for (unsigned corner = 0; corner < corners.length(); ++corner)
        corners[corner] = static_cast<int>(polygons.uvCorners[corner]);
    HStatus status = mesh.setUVs(us, vs, corners);
    data = mesh.object();
    return status;
}

} // namespace

MeshPolygons polygonsOf(const HPlug& plug) {
    const EvaluatedData data(plug);
    HStatus status;
    const HFnMesh mesh(data.handle().asMesh(), &status);
    require(status, plug);
    MeshPolygons polygons;
    polygons.vertexCount = static_cast<std::size_t>(mesh.numVertices());
    polygons.sizes.reserve(static_cast<std::size_t>(mesh.numPolygons()));
    HIntArray vertices;
    for (int polygon = 0; polygon < mesh.numPolygons(); ++polygon) {
        require(mesh.getPolygonVertices(polygon, vertices), plug);
        polygons.sizes.push_back(vertices.length());
        for (const int vertex : vertices)
            polygons.corners.push_back(static_cast<std::uint32_t>(vertex));
    }
    readUvs(mesh, plug, polygons);
    return polygons;
}

void readPoints(const HPlug& mesh, std::vector<double>& xyz) {
    read(mesh, xyz);
}

void readPoints(const HPlug& mesh, std::vector<float>& xyz) {
    read(mesh, xyz);
}

void readPoints(const HPlug& mesh, std::span<float> xyz) {
    read<float>(mesh, [&](std::size_t count) {
        if (count != xyz.size())
            throw std::runtime_error(std::string(mesh.name().asChar()) + " has " + std::to_string(count / 3) +
                                     " vertices, not " + std::to_string(xyz.size() / 3));
        return xyz.data();
    });
}

std::size_t vertexCountOf(const HPlug& plug) {
    HStatus status;
    const HFnGeometryData mesh(plug.asHObject(&status), &status);
    return status.error() ? 0 : mesh.vertexCount();
}

double boxDiagonal(std::span<const float> xyz) {
    double squares = 0.0;
    for (std::size_t axis = 0; axis < 3 && axis < xyz.size(); ++axis) {
        float low = xyz[axis];
        float high = xyz[axis];
        for (std::size_t i = axis; i < xyz.size(); i += 3) {
            low = std::min(low, xyz[i]);
            high = std::max(high, xyz[i]);
        }
        const double side = static_cast<double>(high) - static_cast<double>(low);
        squares += side * side;
    }
    return std::sqrt(squares);
}

double diagonalOf(const HPlug& mesh) {
    std::vector<float> xyz;
    readPoints(mesh, xyz);
    return boxDiagonal(xyz);
}

HObject meshData(std::span<const double> xyz, const MeshPolygons& polygons) {
    HPointArray points(static_cast<unsigned>(xyz.size() / 3));
    for (unsigned vertex = 0; vertex < points.length(); ++vertex) {
        const std::span<const double> point = xyz.subspan(3 * std::size_t{vertex}, 3);
        points[vertex] = HPoint(point[0], point[1], point[2]);
    }
    HIntArray counts(static_cast<unsigned>(polygons.sizes.size()));
    for (unsigned polygon = 0; polygon < counts.length(); ++polygon)
        counts[polygon] = static_cast<int>(polygons.sizes[polygon]);
    HIntArray corners(static_cast<unsigned>(polygons.corners.size()));
    for (unsigned corner = 0; corner < corners.length(); ++corner)
        corners[corner] = static_cast<int>(polygons.corners[corner]);
    HStatus status;
    HObject data = HFnMeshData().create(points, counts, corners, &status);
    if (!status.error() && !polygons.uvs.empty())
        status = setUvs(HFnMesh(data), polygons, data);
    if (status.error())
        throw std::runtime_error(std::string("the mesh cannot be made: ") + status.errorString().asChar());
    return data;
}

} // namespace quarn
