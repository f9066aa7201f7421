// SPDX-License-Identifier: Apache-2.0
// Source of the smallest rotation from one direction to another: T. Möller and J. F. Hughes, "Efficiently Building a
// Matrix to Rotate One Vector to Another", Journal of Graphics Tools 4 (4), 1999.
#include "quarn/play/beforeSkin.h"

#include "quarn/scene/vertexNormals.h"

#include <algorithm>
#include <cmath>

namespace quarn {
namespace {

HVector vectorAt(std::span<const float> xyz, std::size_t index) {
    return {static_cast<double>(xyz[3 * index]), static_cast<double>(xyz[3 * index + 1]),
            static_cast<double>(xyz[3 * index + 2])};
}

void put(std::vector<float>& xyz, std::size_t index, const HVector& vector) {
    xyz[3 * index] = static_cast<float>(vector.x);
    xyz[3 * index + 1] = static_cast<float>(vector.y);
    xyz[3 * index + 2] = static_cast<float>(vector.z);
}

HVector moved(const HVector& point, const HMatrix& matrix) {
    return point * matrix + matrix.row(3);
}

// by the smallest rotation from a to b, both of length 1; opposite ones have none that is the smallest
HVector turned(const HVector& vector, const HVector& a, const HVector& b) {
    const HVector axis = a ^ b;
    const double cosine = a * b;
    if (cosine < -0.9999)
        return vector * -1.0;
    return vector * cosine + (axis ^ vector) + axis * ((axis * vector) / (1.0 + cosine));
}

} // namespace

BeforeSkin::BeforeSkin(const std::vector<std::int32_t>& sceneVertexOf, const MeshPolygons& scene)
    : sceneVertexOf_(sceneVertexOf)
    , scene_(scene) {}

bool BeforeSkin::isSingular(const HMatrix& matrix) {
    double longest = 0.0;
    for (unsigned row = 0; row < 3; ++row)
        longest = std::max(longest, matrix.row(row).length());
    return !(std::abs(matrix.det3x3()) > 1e-6 * longest * longest * longest);
}

// by vertex of the scene; of several that are one, the first
std::vector<float> BeforeSkin::skinned(const FileFrame& file) const {
    std::vector<float> xyz(3 * scene_.vertexCount, 0.0F);
    for (std::size_t vertex = sceneVertexOf_.size(); vertex-- > 0;)
        put(xyz, static_cast<std::size_t>(sceneVertexOf_[vertex]),
            moved(vectorAt(file.before.points, vertex), file.blended[vertex]));
    return xyz;
}

ClipShape BeforeSkin::deltas(const FileFrame& file, std::span<const float> xyz) {
    ClipShape deltas;
    deltas.points.resize(file.before.points.size());
    deltas.normals.resize(file.before.normals.size());
    std::vector<float> from, to;
    if (!deltas.normals.empty()) {
        from = vertexNormals(skinned(file), scene_);
        to = vertexNormals(xyz, scene_);
    }
    for (std::size_t vertex = 0; vertex < sceneVertexOf_.size(); ++vertex) {
        const auto scene = static_cast<std::size_t>(sceneVertexOf_[vertex]);
        const HMatrix& skin = file.blended[vertex];
        const HVector point = vectorAt(file.before.points, vertex);
        const HVector wanted = vectorAt(xyz, scene);
        if (isSingular(skin)) {
            const HVector off = wanted - moved(point, skin);
            Stuck& stuck = stuck_[vertex];
            ++stuck.frames;
            stuck.farthest = std::max(stuck.farthest, off.length());
            continue;
        }
        const HMatrix back = skin.inverse();
        put(deltas.points, vertex, moved(wanted, back) - point);
        if (deltas.normals.empty())
            continue;
        const HVector normal = vectorAt(file.before.normals, vertex);
        const HVector after = turned((normal * skin).normal(), vectorAt(from, scene), vectorAt(to, scene));
        put(deltas.normals, vertex, (after * back).normal() - normal);
    }
    return deltas;
}

} // namespace quarn
