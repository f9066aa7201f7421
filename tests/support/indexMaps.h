// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "quill/IndexMapper.h"
#include "quill/val3.h"

#include <string>
#include <vector>

struct NamedMap {
    std::string name;
    quill::IndexMapper map;
};

// Ways to affect a mesh: all of it, all of it backwards, two thirds of it in a mixed order, nothing.
inline std::vector<NamedMap> indexMaps(std::size_t fullCount) {
    quill::IndexMapper all, backwards, part, nothing;
    all.setIdentity(fullCount);
    std::vector<std::uint32_t> reversed, mixed;
    for (std::size_t k = fullCount; k-- > 0;) {
        reversed.push_back(static_cast<std::uint32_t>(k));
        if (k % 3 != 1)
            mixed.insert(k % 2 == 0 ? mixed.begin() : mixed.end(), static_cast<std::uint32_t>(k));
    }
    backwards.set(std::move(reversed), fullCount);
    part.set(std::move(mixed), fullCount);
    nothing.set({}, fullCount);
    return {{"all", all}, {"backwards", backwards}, {"part", part}, {"nothing", nothing}};
}

// The points of the affected vertices, in affected order; entries that are not below the full count give zero.
inline std::vector<quill::val3<float>> affectedPoints(const std::vector<quill::val3<float>>& full,
                                                      const quill::IndexMapper& map) {
    std::vector<quill::val3<float>> points(map.affectCount());
    for (std::size_t k = 0; k < points.size(); ++k)
        if (map.toFull(k) < full.size())
            points[k] = full[map.toFull(k)];
    return points;
}
