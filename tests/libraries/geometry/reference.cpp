// SPDX-License-Identifier: Apache-2.0
#include "reference.h"

namespace reference {

std::vector<std::set<std::uint32_t>> neighbours(const Polygons& polygons, const quill::IndexMapper& map,
                                                std::size_t extraRings, bool includeSelf) {
    std::vector<std::set<std::uint32_t>> oneRing(map.affectCount());
    for (const auto& polygon : polygons)
        for (std::size_t c = 0; c < polygon.size(); ++c) {
            const std::uint32_t a = map.toAffected(polygon[c]);
            const std::uint32_t b = map.toAffected(polygon[(c + 1) % polygon.size()]);
            if (a == quill::missingIndex || b == quill::missingIndex)
                continue;
            oneRing[a].insert(b);
            oneRing[b].insert(a);
        }
    auto result = oneRing;
    for (std::uint32_t v = 0; v < oneRing.size(); ++v) {
        auto frontier = oneRing[v];
        for (std::size_t ring = 0; ring < extraRings && !frontier.empty(); ++ring) {
            std::set<std::uint32_t> next;
            for (const std::uint32_t u : frontier)
                for (const std::uint32_t w : oneRing[u])
                    if ((w != v || includeSelf) && result[v].insert(w).second)
                        next.insert(w);
            frontier = next;
        }
    }
    return result;
}

std::vector<std::vector<std::uint32_t>> cornerPairs(const Polygons& polygons, const quill::IndexMapper& map,
                                                    const Points* positions) {
    const auto edges = neighbours(polygons, map, 0, false);
    std::vector<std::vector<std::uint32_t>> pairs(map.affectCount());
    for (const auto& polygon : polygons) {
        std::vector<std::uint32_t> list;
        for (const std::uint32_t vertex : polygon)
            if (map.toAffected(vertex) != quill::missingIndex)
                list.push_back(map.toAffected(vertex));
        const std::size_t m = list.size();
        if (m < 3)
            continue;
        for (std::size_t c = 0; c < m; ++c) {
            std::uint32_t a = list[(c + 1) % m], b = list[(c + m - 1) % m];
            float best = -1.0F;
            for (std::size_t j = c + 1; positions && j < c + m; ++j)
                for (std::size_t k = j + 1; k < c + m; ++k) {
                    const auto& p = *positions;
                    const auto here = p[list[c]];
                    const float area = length(cross(p[list[j % m]] - here, p[list[k % m]] - here));
                    const float score = j == c + 1 && k == c + m - 1 ? 2 * area : area;
                    if (score > best) {
                        best = score;
                        a = list[j % m];
                        b = list[k % m];
                    }
                }
            pairs[list[c]].insert(pairs[list[c]].end(), {a, b});
        }
    }
    for (std::size_t v = 0; v < pairs.size(); ++v)
        for (std::size_t p = 0; p < pairs[v].size(); p += 2)
            if (edges[v].contains(pairs[v][p])) {
                std::swap(pairs[v][0], pairs[v][p]);
                std::swap(pairs[v][1], pairs[v][p + 1]);
                break;
            }
    return pairs;
}

quill::mat4d frame(std::uint32_t i, const std::vector<std::uint32_t>& pairs, const Points& positions) {
    const auto o = positions[i];
    if (pairs.empty())
        return {{1, 0, 0, 0, 0, 1, 0, 0, 0, 0, 1, 0, o.x, o.y, o.z, 1}};
    quill::val3<float> normal;
    for (std::size_t p = 0; p < pairs.size(); p += 2)
        normal += cross(positions[pairs[p]] - o, positions[pairs[p + 1]] - o);
    normal.normalize();
    auto tangent = positions[pairs[0]] - o;
    tangent.normalize();
    auto x = cross(normal, tangent);
    x.normalize();
    const auto y = cross(x, normal);
    return {{x.x, x.y, x.z, 0, y.x, y.y, y.z, 0, normal.x, normal.y, normal.z, 0, o.x, o.y, o.z, 1}};
}

Points smooth(Points points, const quill::VertexConnections& connections, const Smoothing& smoothing) {
    const auto& indexer = connections.connectionsIndexer();
    for (std::size_t iteration = 0; iteration < smoothing.iterations; ++iteration) {
        const Points source = points;
        for (std::size_t i = 0; i < connections.vertexCount(); ++i) {
            const bool pinned = smoothing.mask && (*smoothing.mask)[i] != 0;
            if (pinned || indexer[i] == indexer[i + 1])
                continue;
            quill::val3<float> sum;
            if (smoothing.includeSelf)
                sum = source[i];
            for (std::size_t k = indexer[i]; k < indexer[i + 1]; ++k)
                sum += source[connections.connections()[k]] * (smoothing.weights ? (*smoothing.weights)[k] : 1.0F);
            sum /= static_cast<float>(indexer[i + 1] - indexer[i] + (smoothing.includeSelf ? 1 : 0));
            points[i] = smoothing.step == 1.0F ? sum : source[i] + (sum - source[i]) * smoothing.step;
        }
    }
    return points;
}

} // namespace reference
