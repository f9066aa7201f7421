// SPDX-License-Identifier: Apache-2.0
#include "plainLoops.h"

#include <tbb/blocked_range.h>
#include <tbb/parallel_for.h>

#include <algorithm>
#include <cmath>
#include <set>

namespace plain {
namespace {

template <typename Body>
void loop(std::size_t count, const Body& body) {
    tbb::parallel_for(
        tbb::blocked_range<int>(0, static_cast<int>(count), 1),
        [&](const tbb::blocked_range<int>& range) {
            for (int i = range.begin(); i != range.end(); ++i)
                body(static_cast<std::size_t>(i));
        },
        tbb::auto_partitioner());
}

} // namespace

void smoothingPass(const Points& source, Points& destination, const std::vector<std::uint32_t>& indexer,
                   const std::vector<std::uint32_t>& connections, const std::vector<float>& weights) {
    loop(source.size(), [&](std::size_t i) {
        const std::uint32_t begin = indexer[i], end = indexer[i + 1];
        if (begin == end) {
            destination[i] = source[i];
            return;
        }
        float x = 0.0F, y = 0.0F, z = 0.0F;
        for (std::uint32_t k = begin; k < end; ++k) {
            const auto& p = source[connections[k]];
            x += p.x * weights[k];
            y += p.y * weights[k];
            z += p.z * weights[k];
        }
        const float count = static_cast<float>(end - begin);
        destination[i] = {x / count, y / count, z / count};
    });
}

void connectionWeights(std::vector<float>& weights, const Points& points, const std::vector<std::uint32_t>& indexer,
                       const std::vector<std::uint32_t>& connections) {
    loop(points.size(), [&](std::size_t i) {
        double sum = 0.0;
        for (std::uint32_t k = indexer[i]; k < indexer[i + 1]; ++k) {
            const float distance = length(points[i] - points[connections[k]]);
            const double weight = 1.0 / static_cast<double>(std::max(distance, 0.001F));
            sum += weight;
            weights[k] = static_cast<float>(weight);
        }
        const auto scale = static_cast<float>((indexer[i + 1] - indexer[i]) / sum);
        for (std::uint32_t k = indexer[i]; k < indexer[i + 1]; ++k)
            weights[k] *= scale;
    });
}

void frames(std::vector<quill::mat4d>& out, const Points& points, const std::vector<std::uint32_t>& indexer,
            const std::vector<std::uint32_t>& pairs, bool invert) {
    loop(points.size(), [&](std::size_t i) {
        const auto& p = points[i];
        const std::uint32_t begin = indexer[i], end = indexer[i + 1];
        if (begin == end) {
            out[i] = {{1, 0, 0, 0, 0, 1, 0, 0, 0, 0, 1, 0, p.x, p.y, p.z, 1}};
        } else {
            quill::val3<float> n;
            for (std::uint32_t k = begin; k < end; k += 2)
                n += cross(points[pairs[k]] - p, points[pairs[k + 1]] - p);
            n.normalize();
            auto t = points[pairs[begin]] - p;
            t.normalize();
            auto x = cross(n, t);
            x.normalize();
            const auto y = cross(x, n);
            out[i] = {{x.x, x.y, x.z, 0, y.x, y.y, y.z, 0, n.x, n.y, n.z, 0, p.x, p.y, p.z, 1}};
        }
        if (invert)
            out[i].gaussJordanInverse();
    });
}

void transformPoints(Points& points, const quill::mat4d& matrix) {
    loop(points.size(), [&](std::size_t i) { points[i] = transformAsPoint(points[i], matrix); });
}

void invertFrames(std::vector<quill::mat4d>& frames) {
    loop(frames.size(), [&](std::size_t i) { frames[i].inverse(); });
}

void toFloats(const std::vector<quill::mat4d>& frames, std::vector<float>& out) {
    loop(frames.size(), [&](std::size_t i) {
        for (std::size_t k = 0; k < 16; ++k)
            out[16 * i + k] = static_cast<float>(frames[i].m[k]);
    });
}

std::size_t adjacencyBySets(const quill::MeshTopology& topology, std::size_t vertexCount) {
    std::vector<std::set<std::uint32_t>> sets(vertexCount);
    forEachPolygon(topology, [&](std::span<const std::uint32_t> corners) {
        std::uint32_t previous = corners.back();
        for (const std::uint32_t corner : corners) {
            sets[previous].insert(corner);
            sets[corner].insert(previous);
            previous = corner;
        }
    });
    std::size_t total = 0;
    for (const auto& set : sets)
        total += set.size();
    return total;
}

} // namespace plain
