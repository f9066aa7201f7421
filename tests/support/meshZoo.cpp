// SPDX-License-Identifier: Apache-2.0
#include "support/meshZoo.h"

#include <algorithm>
#include <array>
#include <cmath>
#include <map>
#include <numeric>
#include <random>
#include <utility>

namespace {

using Polygons = std::vector<std::vector<std::uint32_t>>;
using Points = std::vector<quill::val3<float>>;

ZooMesh makeTorus(std::uint32_t around, std::uint32_t across) {
    ZooMesh mesh{"torus", {}, {}};
    constexpr double turn = 6.283185307179586;
    for (std::uint32_t i = 0; i < around; ++i)
        for (std::uint32_t j = 0; j < across; ++j) {
            const double u = turn * i / around, v = turn * j / across;
            mesh.points.emplace_back(static_cast<float>((2.0 + std::cos(v)) * std::cos(u)),
                                     static_cast<float>((2.0 + std::cos(v)) * std::sin(u)),
                                     static_cast<float>(std::sin(v)));
            const std::uint32_t nextI = (i + 1) % around, nextJ = (j + 1) % across;
            mesh.polygons.push_back({i * across + j, nextI * across + j, nextI * across + nextJ, i * across + nextJ});
        }
    return mesh;
}

ZooMesh makeRegularPolygon(const std::string& name, std::uint32_t corners) {
    ZooMesh mesh{name, {{}}, {}};
    for (std::uint32_t i = 0; i < corners; ++i) {
        const double angle = 6.283185307179586 * i / corners;
        mesh.points.emplace_back(static_cast<float>(std::cos(angle)), static_cast<float>(std::sin(angle)), 0.25F);
        mesh.polygons[0].push_back(i);
    }
    return mesh;
}

// A grid whose polygons at every seventh place are missing and at every fifth are merged with their right neighbour.
ZooMesh makeGridWithHolesAndHexagons() {
    ZooMesh mesh = makeGrid(9, 6);
    mesh.name = "holes and hexagons";
    Polygons kept;
    for (std::size_t p = 0; p < mesh.polygons.size(); ++p) {
        if (p % 7 == 3)
            continue;
        if (p % 5 == 0 && p % 9 != 8 && (p + 1) % 7 != 3) {
            const auto &a = mesh.polygons[p], &b = mesh.polygons[p + 1];
            kept.push_back({a[0], b[0], b[1], b[2], a[2], a[3]});
            ++p;
        } else {
            kept.push_back(mesh.polygons[p]);
        }
    }
    mesh.polygons = kept;
    return mesh;
}

std::vector<ZooMesh> makeZoo() {
    const Points square{{0, 0, 0}, {1, 0, 0}, {1, 1, 0}, {0, 1, 0}};
    std::vector<ZooMesh> zoo;
    zoo.push_back({"empty", {}, {}});
    zoo.push_back({"points only", {}, square});
    zoo.push_back({"triangle", {{0, 1, 2}}, {{0, 0, 0}, {1, 0, 0}, {0, 1, 0}}});
    zoo.push_back({"quad", {{0, 1, 2, 3}}, square});
    zoo.push_back({"concave quad", {{0, 1, 2, 3}}, {{0, 0, 0}, {2, 0, 0.1F}, {0.4F, 0.4F, 0}, {0, 2, 0.2F}}});
    zoo.push_back(makeRegularPolygon("hexagon", 6));
    zoo.push_back(makeRegularPolygon("23-gon", 23));
    zoo.push_back(makeGrid(7, 5));
    zoo.push_back(makeGridWithHolesAndHexagons());
    zoo.push_back(makeIcosphere(1));
    zoo.push_back(shuffled(makeIcosphere(2), 5));
    zoo.push_back(makeTorus(11, 7));
    zoo.push_back({"three sheets on an edge",
                   {{0, 1, 2}, {0, 1, 3}, {1, 0, 4}},
                   {{0, 0, 0}, {0, 0, 1}, {1, 0, 0}, {0, 1, 0}, {-1, -1, 0}}});
    zoo.push_back({"bow tie", {{0, 1, 2}, {0, 3, 4}}, {{0, 0, 0}, {1, 0, 0}, {1, 1, 0}, {-1, 0, 0}, {-1, 0, 1}}});
    zoo.push_back({"isolated vertices", {{1, 2, 4}}, {{5, 5, 5}, {0, 0, 0}, {1, 0, 0}, {6, 6, 6}, {0, 1, 0}}});
    zoo.push_back({"zero area", {{0, 1, 2}, {1, 3, 2}}, {{0, 0, 0}, {1, 0, 0}, {2, 0, 0}, {3, 0, 0}}, true});
    zoo.push_back({"coincident points", {{0, 1, 2, 3}, {2, 3, 4}}, Points(5, {1, 2, 3}), true});
    zoo.push_back({"short polygons", {{0}, {1, 2}, {0, 1, 2}, {3, 3}, {2, 2, 3}}, square, true});
    zoo.push_back({"vertex twice in a polygon", {{0, 1, 0, 2, 3}}, square, true});
    return zoo;
}

} // namespace

quill::MeshTopology makeTopology(const Polygons& polygons, std::size_t vertexCount) {
    quill::MeshTopology topology;
    topology.polygonOffsets.push_back(0);
    for (const auto& polygon : polygons) {
        topology.polygonVertices.insert(topology.polygonVertices.end(), polygon.begin(), polygon.end());
        topology.polygonOffsets.push_back(static_cast<std::uint32_t>(topology.polygonVertices.size()));
    }
    topology.polygonCount = polygons.size();
    topology.vertexCount = static_cast<int>(vertexCount);
    topology.valid = true;
    return topology;
}

quill::MeshTopology ZooMesh::topology() const {
    return makeTopology(polygons, points.size());
}

ZooMesh makeGrid(std::size_t columns, std::size_t rows) {
    ZooMesh mesh{"grid", {}, {}};
    mesh.points.reserve((columns + 1) * (rows + 1));
    mesh.polygons.reserve(columns * rows);
    const auto vertex = [&](std::size_t c, std::size_t r) { return static_cast<std::uint32_t>(r * (columns + 1) + c); };
    for (std::size_t r = 0; r <= rows; ++r)
        for (std::size_t c = 0; c <= columns; ++c)
            mesh.points.emplace_back(static_cast<float>(c) * 0.1F, static_cast<float>(r) * 0.1F,
                                     static_cast<float>(0.05 * std::sin(0.7 * static_cast<double>(c + 2 * r))));
    for (std::size_t r = 0; r < rows; ++r)
        for (std::size_t c = 0; c < columns; ++c)
            mesh.polygons.push_back({vertex(c, r), vertex(c + 1, r), vertex(c + 1, r + 1), vertex(c, r + 1)});
    return mesh;
}

ZooMesh makeIcosphere(std::size_t subdivisions) {
    const float g = 1.618034F;
    ZooMesh mesh{"icosphere",
                 {{0, 11, 5},  {0, 5, 1},  {0, 1, 7},  {0, 7, 10}, {0, 10, 11}, {1, 5, 9}, {5, 11, 4},
                  {11, 10, 2}, {10, 7, 6}, {7, 1, 8},  {3, 9, 4},  {3, 4, 2},   {3, 2, 6}, {3, 6, 8},
                  {3, 8, 9},   {4, 9, 5},  {2, 4, 11}, {6, 2, 10}, {8, 6, 7},   {9, 8, 1}},
                 {{-1, g, 0},
                  {1, g, 0},
                  {-1, -g, 0},
                  {1, -g, 0},
                  {0, -1, g},
                  {0, 1, g},
                  {0, -1, -g},
                  {0, 1, -g},
                  {g, 0, -1},
                  {g, 0, 1},
                  {-g, 0, -1},
                  {-g, 0, 1}}};
    for (std::size_t s = 0; s < subdivisions; ++s) {
        std::map<std::pair<std::uint32_t, std::uint32_t>, std::uint32_t> middles;
        const auto middle = [&](std::uint32_t a, std::uint32_t b) {
            const auto [found, isNew] = middles.try_emplace(std::minmax(a, b), mesh.points.size());
            if (isNew)
                mesh.points.push_back((mesh.points[a] + mesh.points[b]) / 2.0F);
            return found->second;
        };
        Polygons finer;
        for (const auto& t : mesh.polygons) {
            const std::uint32_t a = middle(t[0], t[1]), b = middle(t[1], t[2]), c = middle(t[2], t[0]);
            finer.insert(finer.end(), {{t[0], a, c}, {t[1], b, a}, {t[2], c, b}, {a, b, c}});
        }
        mesh.polygons = std::move(finer);
    }
    for (auto& p : mesh.points)
        p.normalize();
    return mesh;
}

ZooMesh shuffled(const ZooMesh& mesh, std::uint32_t seed) {
    std::mt19937 random(seed);
    std::vector<std::uint32_t> newIndex(mesh.vertexCount());
    std::iota(newIndex.begin(), newIndex.end(), 0U);
    std::shuffle(newIndex.begin(), newIndex.end(), random);
    ZooMesh result{"shuffled " + mesh.name, mesh.polygons, Points(mesh.vertexCount()), mesh.degenerate};
    for (std::size_t v = 0; v < mesh.vertexCount(); ++v)
        result.points[newIndex[v]] = mesh.points[v];
    for (auto& polygon : result.polygons)
        for (auto& vertex : polygon)
            vertex = newIndex[vertex];
    std::shuffle(result.polygons.begin(), result.polygons.end(), random);
    return result;
}

const std::vector<ZooMesh>& meshZoo() {
    static const std::vector<ZooMesh> zoo = makeZoo();
    return zoo;
}
