// SPDX-License-Identifier: Apache-2.0
#include "quarn/render/Subject.h"

#include "quarn/console/UsageError.h"

#include <algorithm>
#include <limits>
#include <span>

namespace quarn {
namespace {

constexpr double enough = 0.1; // of what moves or differs most; below, a network's noise would count everywhere

HVector pointOf(const MeshFrame& frame, std::size_t vertex) {
    return {frame.points[3 * vertex], frame.points[3 * vertex + 1], frame.points[3 * vertex + 2]};
}

std::vector<bool> seenVertices(const MeshPolygons& polygons) {
    std::vector<bool> seen(polygons.vertexCount);
    std::span<const std::uint32_t> corners = polygons.corners;
    for (const std::uint32_t size : polygons.sizes) {
        if (size > 2)
            for (const std::uint32_t vertex : corners.first(size))
                seen[vertex] = true;
        corners = corners.subspan(size);
    }
    return seen;
}

} // namespace

FrameOn frameOnFrom(const std::string& text) {
    if (text == "all")
        return FrameOn::all;
    if (text == "moving")
        return FrameOn::moving;
    if (text == "differing")
        return FrameOn::differing;
    throw UsageError("\"" + text + "\" is nothing to frame on: write all, moving or differing");
}

Subject::Subject(FrameOn what, const Framing& framing)
    : what_(what)
    , framing_(framing) {}

void Subject::include(const std::vector<PanelFrame>& panels) {
    std::map<const Mesh*, const MeshFrame*> first;
    for (const PanelFrame& panel : panels)
        for (std::size_t place = 0; place < panel.size(); ++place) {
            const MeshFrame& frame = panel[place];
            const auto [at, isNew] = meshes_.try_emplace({place, frame.points.size() / 3});
            Mesh& mesh = at->second;
            if (isNew) {
                mesh.resize(at->first.second);
                const std::vector<bool> seen = seenVertices(frame.polygons);
                for (std::size_t vertex = 0; vertex < mesh.size(); ++vertex)
                    mesh[vertex].isSeen = seen[vertex];
            }
            include(frame, mesh, *first.try_emplace(&mesh, &frame).first->second);
        }
}

void Subject::include(const MeshFrame& frame, Mesh& mesh, const MeshFrame& first) const {
    for (std::size_t number = 0; number < mesh.size(); ++number) {
        Vertex& vertex = mesh[number];
        const HVector point = pointOf(frame, number);
        vertex.difference = std::max(vertex.difference, (point - pointOf(first, number)).length());
        if (!frame.distances.empty())
            vertex.difference = std::max(vertex.difference, frame.distances[number]);
        if (&frame == &first) {
            const bool isNew = vertex.reach.isEmpty();
            for (unsigned axis = 0; axis < 3; ++axis) {
                vertex.lowest[axis] = isNew ? point[axis] : std::min(vertex.lowest[axis], point[axis]);
                vertex.highest[axis] = isNew ? point[axis] : std::max(vertex.highest[axis], point[axis]);
            }
        }
        vertex.reach.include(framing_.reachOf(point));
    }
}

double Subject::amount(const Vertex& vertex) const {
    if (!vertex.isSeen || what_ == FrameOn::all)
        return 0.0;
    return what_ == FrameOn::moving ? (vertex.highest - vertex.lowest).length() : vertex.difference;
}

double Subject::largest() const {
    double result = 0.0;
    for (const auto& [key, mesh] : meshes_)
        for (const Vertex& vertex : mesh)
            result = std::max(result, amount(vertex));
    return result;
}

bool Subject::isFound() const {
    return what_ == FrameOn::all || largest() > 0.0;
}

Camera Subject::camera() const {
    const double least = enough * largest();
    Framing::Reach reach;
    for (const auto& [key, mesh] : meshes_)
        for (const Vertex& vertex : mesh)
            if (vertex.isSeen && amount(vertex) >= least)
                reach.include(vertex.reach);
    return framing_.camera(reach);
}

} // namespace quarn
