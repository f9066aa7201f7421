// SPDX-License-Identifier: Apache-2.0
// Linear blend skinning as in: N. Magnenat-Thalmann, R. Laperriere, D. Thalmann, "Joint-dependent local deformations
// for hand animation and object grasping", Graphics Interface 1988. Double precision throughout.
#include "rig/linearBlend.h"

#include <oneapi/tbb/blocked_range.h>
#include <oneapi/tbb/parallel_for.h>

#include <cstddef>

namespace rig {
namespace {

// some microseconds of work: less is not worth a task
constexpr std::size_t smallestRange = 512;

HVector blended(const SkinWeights& skin, const std::vector<Affine>& joints, std::size_t vertex, const HPoint& p) {
    HVector sum;
    for (std::size_t k = skin.first[vertex]; k < skin.first[vertex + 1]; ++k) {
        const Influence& influence = skin.influences[k];
        const Affine& m = joints[influence.joint];
        sum.x += influence.weight * (p.x * m[0] + p.y * m[3] + p.z * m[6] + m[9]);
        sum.y += influence.weight * (p.x * m[1] + p.y * m[4] + p.z * m[7] + m[10]);
        sum.z += influence.weight * (p.x * m[2] + p.y * m[5] + p.z * m[8] + m[11]);
    }
    return sum;
}

void blendPoint(const BlendTask& task, std::size_t i, HPoint& point) {
    const std::size_t vertex = task.vertices.isEmpty() ? i : task.vertices[i];
    if (task.skin.first[vertex] == task.skin.first[vertex + 1])
        return;
    const double factor = task.pointWeights ? task.envelope * static_cast<double>(task.pointWeights[i]) : task.envelope;
    const HVector moved = blended(task.skin, task.joints, vertex, point);
    // not by the formula below, which rounds
    if (factor == 1.0)
        point = HPoint(moved);
    else
        point += (moved - static_cast<HVector>(point)) * factor;
}

} // namespace

Affine affineOf(const HMatrix& matrix) {
    Affine made{};
    for (std::size_t i = 0; i < made.size(); ++i)
        made[i] = matrix.matrix[i / 3][i % 3];
    return made;
}

void blendPoints(const BlendTask& task, HPointArray& points) {
    using Range = tbb::blocked_range<std::size_t>;
    tbb::parallel_for(Range(0, points.length(), smallestRange), [&](const Range& range) {
        for (std::size_t i = range.begin(); i < range.end(); ++i)
            blendPoint(task, i, points[i]);
    });
}

} // namespace rig
