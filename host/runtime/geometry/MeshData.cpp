// SPDX-License-Identifier: Apache-2.0
#include "geometry/MeshData.h"

#include "core/text.h"
#include "geometry/forRanges.h"

#include <cmath>
#include <limits>
#include <stdexcept>

namespace OpenQuarn {
namespace {

/// Two corners are an edge that bounds no face.
constexpr int fewestCorners = 2;

std::string number(std::size_t value) {
    return std::to_string(value);
}

// offsets of the polygons; checks that the counts are usable and add up to the corners that there are
std::vector<unsigned> offsetsOf(const HIntArray& counts, std::size_t cornerCount) {
    std::vector<unsigned> offsets;
    offsets.reserve(std::size_t{counts.length()} + 1);
    std::size_t total = 0;
    offsets.push_back(0);
    for (std::size_t polygon = 0; polygon < counts.length(); ++polygon) {
        if (counts[polygon] < fewestCorners)
            throw std::invalid_argument("polygon " + number(polygon) + " has " + std::to_string(counts[polygon]) +
                                        " vertices: it needs at least " + std::to_string(fewestCorners));
        total += static_cast<unsigned>(counts[polygon]);
        if (total > cornerCount)
            throw std::invalid_argument("polygon " + number(polygon) + " ends at vertex number " + number(total) +
                                        " of the list of polygon vertices, which has " + number(cornerCount));
        offsets.push_back(static_cast<unsigned>(total));
    }
    if (total != cornerCount)
        throw std::invalid_argument("the polygons have " + number(total) + " vertices, the list of polygon vertices " +
                                    number(cornerCount));
    return offsets;
}

void checkCorners(const HIntArray& connects, std::size_t vertexCount) {
    for (std::size_t corner = 0; corner < connects.length(); ++corner)
        if (connects[corner] < 0 || static_cast<std::size_t>(connects[corner]) >= vertexCount)
            throw std::invalid_argument("polygon vertex number " + number(corner) + " is " +
                                        std::to_string(connects[corner]) + ": the mesh has " + number(vertexCount) +
                                        " vertices");
}

std::shared_ptr<const Positions> positionsOf(const HPointArray& points) {
    const std::shared_ptr<Positions> positions = newPositions(points.length());
    double* xyz = positions->xyz();
    for (const HPoint& point : points) {
        *xyz++ = point.x;
        *xyz++ = point.y;
        *xyz++ = point.z;
    }
    return positions;
}

void checkTag(const MeshData& mesh, const std::string& name, const HUintArray& vertices) {
    if (!isIdentifier(name))
        throw std::invalid_argument("'" + name + "' cannot name a component tag");
    std::vector<bool> listed(mesh.vertexCount());
    for (const unsigned vertex : vertices) {
        if (vertex >= mesh.vertexCount())
            throw std::invalid_argument("component tag '" + name + "' lists vertex " + number(vertex) +
                                        ": the mesh has " + number(mesh.vertexCount()) + " vertices");
        if (listed[vertex])
            throw std::invalid_argument("component tag '" + name + "' lists vertex " + number(vertex) + " twice");
        listed[vertex] = true;
    }
}

void checkUvs(const MeshData& mesh, const HFloatArray& us, const HFloatArray& vs, const HIntArray& corners) {
    if (us.length() != vs.length() || us.length() > static_cast<std::size_t>(std::numeric_limits<int>::max()))
        throw std::invalid_argument("UVs with " + number(us.length()) + " times u and " + number(vs.length()) +
                                    " times v");
    for (std::size_t uv = 0; uv < us.length(); ++uv)
        if (!std::isfinite(us[uv]) || !std::isfinite(vs[uv]))
            throw std::invalid_argument("UV " + number(uv) + " is not finite");
    if (corners.length() != mesh.topology->corners.size())
        throw std::invalid_argument("UVs for " + number(corners.length()) + " corners: the polygons have " +
                                    number(mesh.topology->corners.size()));
    for (std::size_t corner = 0; corner < corners.length(); ++corner)
        if (corners[corner] < 0 || static_cast<std::size_t>(corners[corner]) >= us.length())
            throw std::invalid_argument("corner " + number(corner) + " has UV " + std::to_string(corners[corner]) +
                                        " of " + number(us.length()));
}

std::shared_ptr<ComponentTags> copyOfTags(const MeshData& mesh) {
    return mesh.tags ? std::make_shared<ComponentTags>(*mesh.tags) : std::make_shared<ComponentTags>();
}

} // namespace

std::shared_ptr<MeshData> MeshData::withPositions(std::shared_ptr<const Positions> positions) const {
    return std::make_shared<MeshData>(topology, std::move(positions), tags, uvs);
}

std::shared_ptr<MeshData> MeshData::withComponentTags(std::shared_ptr<const ComponentTags> componentTags) const {
    return std::make_shared<MeshData>(topology, points, std::move(componentTags), uvs);
}

std::shared_ptr<const HUintArray> MeshData::tag(const std::string& name) const {
    if (!tags)
        return nullptr;
    const auto found = tags->find(name);
    return found == tags->end() ? nullptr : found->second;
}

std::shared_ptr<MeshData> makeMesh(const HPointArray& points, const HIntArray& counts, const HIntArray& connects) {
    constexpr std::size_t mostVertices = std::numeric_limits<int>::max();
    if (points.length() > mostVertices)
        throw std::invalid_argument("a mesh cannot have " + number(points.length()) + " vertices");
    const auto topology = std::make_shared<Topology>();
    topology->vertexCount = points.length();
    topology->offsets = offsetsOf(counts, connects.length());
    checkCorners(connects, points.length());
    topology->corners.assign(connects.begin(), connects.end());
    return std::make_shared<MeshData>(topology, positionsOf(points), nullptr);
}

std::shared_ptr<MeshData> withPoints(const MeshData& mesh, const HPointArray& points) {
    if (points.length() != mesh.vertexCount())
        throw std::invalid_argument("a mesh of " + number(mesh.vertexCount()) + " vertices cannot have " +
                                    number(points.length()) + " points");
    return mesh.withPositions(positionsOf(points));
}

std::shared_ptr<MeshData> withTag(const MeshData& mesh, const std::string& name, const HUintArray& vertices) {
    checkTag(mesh, name, vertices);
    const std::shared_ptr<ComponentTags> tags = copyOfTags(mesh);
    (*tags)[name] = std::make_shared<HUintArray>(vertices);
    return mesh.withComponentTags(tags);
}

std::shared_ptr<MeshData> withTags(const MeshData& mesh, const std::shared_ptr<const ComponentTags>& tags) {
    for (const auto& [name, vertices] : *tags)
        checkTag(mesh, name, *vertices);
    return mesh.withComponentTags(tags);
}

std::shared_ptr<MeshData> withoutTag(const MeshData& mesh, const std::string& name) {
    const std::shared_ptr<ComponentTags> tags = copyOfTags(mesh);
    if (tags->erase(name) == 0)
        throw std::invalid_argument("the geometry has no component tag '" + name + "'");
    return mesh.withComponentTags(tags);
}

std::shared_ptr<MeshData> withUvs(const MeshData& mesh, const HFloatArray& us, const HFloatArray& vs,
                                  const HIntArray& corners) {
    if (us.length() == 0 && vs.length() == 0 && corners.length() == 0)
        return std::make_shared<MeshData>(mesh.topology, mesh.points, mesh.tags);
    checkUvs(mesh, us, vs, corners);
    const auto set = std::make_shared<UvSet>();
    set->uvs.reserve(2 * std::size_t{us.length()});
    for (unsigned uv = 0; uv < us.length(); ++uv)
        set->uvs.insert(set->uvs.end(), {us[uv], vs[uv]});
    set->corners.assign(corners.begin(), corners.end());
    return std::make_shared<MeshData>(mesh.topology, mesh.points, mesh.tags, set);
}

HStatus copyPoints(const Positions& from, HPointArray& points) {
    if (HStatus status = points.setLength(from.vertexCount()); status.error())
        return status;
    const double* xyz = from.xyz();
    HPoint* to = points.data();
    forRanges(from.vertexCount(), [&](std::size_t begin, std::size_t end) {
        for (std::size_t i = begin; i < end; ++i)
            to[i] = HPoint(xyz[3 * i], xyz[3 * i + 1], xyz[3 * i + 2]);
    });
    return HStatus::kSuccess;
}

} // namespace OpenQuarn
