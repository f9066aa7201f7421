// SPDX-License-Identifier: Apache-2.0
#include "quarn/render/heat.h"

#include <algorithm>
#include <array>
#include <cmath>

namespace quarn {
namespace {

// The colour map "viridis" by Stefan van der Walt and Nathaniel Smith (CC0): entries 0, 16, 32 ... 240 and 255 of 256.
constexpr std::array<Vec3, 17> viridis = {{
    {0.2670F, 0.0049F, 0.3294F},
    {0.2823F, 0.0950F, 0.4173F},
    {0.2788F, 0.1755F, 0.4834F},
    {0.2590F, 0.2515F, 0.5247F},
    {0.2297F, 0.3224F, 0.5457F},
    {0.1994F, 0.3876F, 0.5546F},
    {0.1727F, 0.4488F, 0.5579F},
    {0.1490F, 0.5081F, 0.5573F},
    {0.1276F, 0.5669F, 0.5506F},
    {0.1206F, 0.6258F, 0.5335F},
    {0.1579F, 0.6838F, 0.5017F},
    {0.2461F, 0.7389F, 0.4520F},
    {0.3692F, 0.7889F, 0.3829F},
    {0.5160F, 0.8312F, 0.2943F},
    {0.6785F, 0.8637F, 0.1895F},
    {0.8456F, 0.8873F, 0.0997F},
    {0.9932F, 0.9062F, 0.1439F},
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

double roundedUp(double value) {
    if (!(value > 0.0))
        return 1.0;
    const double power = std::pow(10.0, std::floor(std::log10(value)));
    for (const double step : {1.0, 2.0, 5.0})
        if (value <= step * power * (1.0 + 1e-9))
            return step * power;
    return 10.0 * power;
}

Vec3 heatColour(float heat) {
    constexpr float last = viridis.size() - 1;
    const float at = heat > 0.0F ? std::min(heat, 1.0F) * last : 0.0F;
    const auto below = std::min(static_cast<std::size_t>(at), viridis.size() - 2);
    return mix(viridis[below], viridis[below + 1], at - static_cast<float>(below));
}

} // namespace quarn
