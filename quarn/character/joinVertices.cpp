// SPDX-License-Identifier: Apache-2.0
#include "quarn/character/joinVertices.h"

#include <algorithm>
#include <numeric>
#include <tuple>
#include <utility>

namespace quarn {
namespace {

int compare(const HPoint& a, const HPoint& b) {
    const auto left = std::tie(a.x, a.y, a.z);
    const auto right = std::tie(b.x, b.y, b.z);
    return left < right ? -1 : right < left ? 1 : 0;
}

int compare(const std::vector<Influence>& a, const std::vector<Influence>& b) {
    if (a.size() != b.size())
        return a.size() < b.size() ? -1 : 1;
    for (std::size_t i = 0; i < a.size(); ++i) {
        const auto left = std::tie(a[i].joint, a[i].weight);
        const auto right = std::tie(b[i].joint, b[i].weight);
        if (left != right)
            return left < right ? -1 : 1;
    }
    return 0;
}

struct Morph {
    std::size_t target;
    HVector delta;
};

// of every vertex the targets that move it; nothing in a mesh without targets
std::vector<std::vector<Morph>> morphsOf(const CharacterMesh& mesh) {
    std::vector<std::vector<Morph>> morphs(mesh.morphTargets.empty() ? 0 : mesh.points.size());
    for (std::size_t t = 0; t < mesh.morphTargets.size(); ++t)
        for (std::size_t i = 0; i < mesh.morphTargets[t].vertices.size(); ++i)
            morphs[mesh.morphTargets[t].vertices[i]].push_back({t, mesh.morphTargets[t].deltas[i]});
    return morphs;
}

int compare(const std::vector<Morph>& a, const std::vector<Morph>& b) {
    if (a.size() != b.size())
        return a.size() < b.size() ? -1 : 1;
    for (std::size_t i = 0; i < a.size(); ++i) {
        const auto left = std::tie(a[i].target, a[i].delta.x, a[i].delta.y, a[i].delta.z);
        const auto right = std::tie(b[i].target, b[i].delta.x, b[i].delta.y, b[i].delta.z);
        if (left != right)
            return left < right ? -1 : 1;
    }
    return 0;
}

class VertexOrder {
public:
    explicit VertexOrder(const CharacterMesh& mesh)
        : mesh_(mesh)
        , morphs_(morphsOf(mesh)) {}

    int compareVertices(std::uint32_t a, std::uint32_t b) const {
        if (const int byPosition = compare(mesh_.points[a], mesh_.points[b]); byPosition != 0)
            return byPosition;
        if (const int byInfluence = compare(mesh_.influences[a], mesh_.influences[b]); byInfluence != 0)
            return byInfluence;
        return morphs_.empty() ? 0 : compare(morphs_[a], morphs_[b]);
    }

private:
    const CharacterMesh& mesh_;
    std::vector<std::vector<Morph>> morphs_;
};

// for every vertex the first one of the file that it equals, bit by bit (decision 0068)
std::vector<std::uint32_t> firstEquals(const CharacterMesh& mesh) {
    const VertexOrder vertices(mesh);
    std::vector<std::uint32_t> order(mesh.points.size());
    std::iota(order.begin(), order.end(), 0U);
    std::sort(order.begin(), order.end(), [&](std::uint32_t a, std::uint32_t b) {
        const int result = vertices.compareVertices(a, b);
        return result != 0 ? result < 0 : a < b;
    });

    std::vector<std::uint32_t> first(order.size());
    for (std::size_t i = 0; i < order.size(); ++i) {
        const bool again = i > 0 && vertices.compareVertices(order[i - 1], order[i]) == 0;
        first[order[i]] = again ? first[order[i - 1]] : order[i];
    }
    return first;
}

// of vertices that became one the first one's delta stands for all
void keepFirstDeltas(CharacterMesh& mesh, const std::vector<std::uint32_t>& first) {
    for (MorphTarget& target : mesh.morphTargets) {
        std::size_t count = 0;
        for (std::size_t i = 0; i < target.vertices.size(); ++i) {
            const std::uint32_t vertex = target.vertices[i];
            if (first[vertex] != vertex)
                continue;
            target.vertices[count] = mesh.joinedOf[vertex];
            target.deltas[count++] = target.deltas[i];
        }
        target.vertices.resize(count);
        target.deltas.resize(count);
    }
}

void keepFirstVertices(CharacterMesh& mesh) {
    const std::vector<std::uint32_t> first = firstEquals(mesh);
    mesh.joinedOf.resize(first.size());
    std::uint32_t count = 0;
    for (std::uint32_t vertex = 0; vertex < first.size(); ++vertex) {
        if (first[vertex] != vertex) {
            mesh.joinedOf[vertex] = mesh.joinedOf[first[vertex]];
            continue;
        }
        if (count != vertex) {
            mesh.points[count] = mesh.points[vertex];
            mesh.influences[count] = std::move(mesh.influences[vertex]);
        }
        mesh.joinedOf[vertex] = count++;
    }
    mesh.points.resize(count);
    mesh.influences.resize(count);
    keepFirstDeltas(mesh, first);
}

// the corners of a polygon, without those that repeat the one before; false when too little is left
bool keepCorners(std::vector<std::size_t>& kept, const std::vector<std::uint32_t>& corners, std::size_t first,
                 std::uint32_t size) {
    const std::size_t begin = kept.size();
    for (std::size_t corner = first; corner < first + size; ++corner)
        if (kept.size() == begin || corners[kept.back()] != corners[corner])
            kept.push_back(corner);
    while (kept.size() > begin + 1 && corners[kept.back()] == corners[kept[begin]])
        kept.pop_back();
    if (kept.size() >= begin + 3)
        return true;
    kept.resize(begin);
    return false;
}

// `kept` rises
void keepOnly(std::vector<std::uint32_t>& numbers, const std::vector<std::size_t>& kept) {
    if (numbers.empty())
        return;
    for (std::size_t i = 0; i < kept.size(); ++i)
        numbers[i] = numbers[kept[i]];
    numbers.resize(kept.size());
}

std::size_t renumberPolygons(CharacterMesh& mesh) {
    for (std::uint32_t& corner : mesh.corners)
        corner = mesh.joinedOf[corner];
    std::vector<std::size_t> kept;
    std::vector<std::uint32_t> sizes;
    kept.reserve(mesh.corners.size());
    sizes.reserve(mesh.polygonSizes.size());
    std::size_t first = 0;
    for (const std::uint32_t size : mesh.polygonSizes) {
        const std::size_t before = kept.size();
        if (keepCorners(kept, mesh.corners, first, size))
            sizes.push_back(static_cast<std::uint32_t>(kept.size() - before));
        first += size;
    }
    const std::size_t gone = mesh.polygonSizes.size() - sizes.size();
    keepOnly(mesh.corners, kept);
    keepOnly(mesh.cornerUvs, kept);
    mesh.polygonSizes = std::move(sizes);
    return gone;
}

} // namespace

std::size_t joinVertices(CharacterMesh& mesh) {
    keepFirstVertices(mesh);
    return renumberPolygons(mesh);
}

} // namespace quarn
