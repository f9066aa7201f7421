// SPDX-License-Identifier: Apache-2.0
#include "quarn/render/heat.h"

#include <algorithm>
#include <array>
#include <cmath>

namespace quarn {
namespace {

// From light grey over yellow to red, darker all the way: at 0, 1/4 ... 1.
constexpr std::array<Vec3, 5> stops = {{
    {0.87F, 0.87F, 0.87F},
    {0.96F, 0.79F, 0.38F},
    {0.97F, 0.63F, 0.14F},
    {0.90F, 0.36F, 0.10F},
    {0.70F, 0.04F, 0.09F},
}};

} // namespace

std::vector<double> distances(std::span<const double> xyz, std::span<const double> reference) {
    std::vector<double> result(xyz.size() / 3);
    for (std::size_t vertex = 0; vertex < result.size(); ++vertex) {
        const std::size_t at = 3 * vertex;
        result[vertex] =
            std::hypot(xyz[at] - reference[at], xyz[at + 1] - reference[at + 1], xyz[at + 2] - reference[at + 2]);
    }
    return result;
}

Vec3 heatColour(float heat) {
    constexpr float last = stops.size() - 1;
    const float at = heat > 0.0F ? std::min(heat, 1.0F) * last : 0.0F;
    const auto below = std::min(static_cast<std::size_t>(at), stops.size() - 2);
    return mix(stops[below], stops[below + 1], at - static_cast<float>(below));
}

} // namespace quarn
