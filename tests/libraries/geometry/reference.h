// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "quill/IndexMapper.h"
#include "quill/VertexConnections.h"
#include "quill/mat4d.h"
#include "quill/val3.h"

#include <cstdint>
#include <set>
#include <vector>

// The library's results by the most direct route: sets, one vertex after the other, no shared code with the library
// but its value types. Slow and plain on purpose.
namespace reference {

using Points = std::vector<quill::val3<float>>;
using Polygons = std::vector<std::vector<std::uint32_t>>;

// Neighbour sets of every affected vertex.
std::vector<std::set<std::uint32_t>> neighbours(const Polygons& polygons, const quill::IndexMapper& map,
                                                std::size_t extraRings, bool includeSelf);

// Corner pairs of every affected vertex, the tangent reference first. positions may be null.
std::vector<std::vector<std::uint32_t>> cornerPairs(const Polygons& polygons, const quill::IndexMapper& map,
                                                    const Points* positions);

// The frame of vertex i, whose pairs are two entries each.
quill::mat4d frame(std::uint32_t i, const std::vector<std::uint32_t>& pairs, const Points& positions);

struct Smoothing {
    std::size_t iterations = 1;
    float step = 1.0F;
    const std::vector<std::uint8_t>* mask = nullptr;
    const std::vector<float>* weights = nullptr;
    bool includeSelf = false;
};

Points smooth(Points points, const quill::VertexConnections& connections, const Smoothing& smoothing);

} // namespace reference
