// SPDX-License-Identifier: Apache-2.0
#include "viewer/RasterLight.h"

#include <algorithm>
#include <cmath>
#include <cstddef>

namespace viewer {
namespace {

constexpr std::array<Colour, 5> heatStops = {{
    {0.87F, 0.87F, 0.87F},
    {0.96F, 0.79F, 0.38F},
    {0.97F, 0.63F, 0.14F},
    {0.90F, 0.36F, 0.10F},
    {0.70F, 0.04F, 0.09F},
}};

// linear; the directions have length 1
constexpr Colour skyAbove{0.98F, 1.04F, 1.14F};
constexpr Colour skyBelow{0.46F, 0.40F, 0.37F};
constexpr Colour key{2.25F, 2.10F, 1.90F};
constexpr std::array<float, 3> towardsKey{-0.457026F, 0.566712F, 0.685539F};
constexpr std::array<float, 3> halfway{-0.248918F, 0.308659F, 0.918025F}; // between the key light and the viewer
constexpr Colour rim{0.16F, 0.17F, 0.19F};
constexpr float sheen = 0.05F;

float dot(const std::array<float, 3>& a, const std::array<float, 3>& b) {
    return a[0] * b[0] + a[1] * b[1] + a[2] * b[2];
}

float raised(float base, int exponent) {
    float result = 1.0F;
    for (; exponent > 0; exponent /= 2, base *= base)
        result *= exponent % 2 == 1 ? base : 1.0F;
    return result;
}

float shoulder(float light) {
    constexpr float knee = 0.6F;
    return light <= knee ? light : knee + (1.0F - knee) * (1.0F - std::exp(-(light - knee) / (1.0F - knee)));
}

// IEC 61966-2-1
float encoded(float linear) {
    return linear <= 0.0031308F ? 12.92F * linear : 1.055F * std::pow(linear, 1.0F / 2.4F) - 0.055F;
}

float decoded(float srgb) {
    return srgb <= 0.04045F ? srgb / 12.92F : std::pow((srgb + 0.055F) / 1.055F, 2.4F);
}

} // namespace

Colour heatColour(float share) {
    constexpr float last = heatStops.size() - 1;
    const float at = share > 0.0F ? std::min(share, 1.0F) * last : 0.0F;
    const auto below = std::min(static_cast<std::size_t>(at), heatStops.size() - 2);
    const float part = at - static_cast<float>(below);
    Colour colour{};
    for (std::size_t channel = 0; channel < colour.size(); ++channel)
        colour[channel] = heatStops[below][channel] * (1.0F - part) + heatStops[below + 1][channel] * part;
    return colour;
}

RasterLight::RasterLight()
    : shown_() {
    const auto intervals = static_cast<float>(shown_.size() - 2);
    for (std::size_t i = 0; i < shown_.size(); ++i)
        shown_[i] = 255.0F * encoded(shoulder(static_cast<float>(i) / intervals * brightest));
}

float RasterLight::shown(float light) const {
    const float at = std::clamp(light / brightest, 0.0F, 1.0F) * static_cast<float>(shown_.size() - 2);
    const auto below = static_cast<std::size_t>(at);
    return shown_[below] + (at - static_cast<float>(below)) * (shown_[below + 1] - shown_[below]);
}

Colour RasterLight::lit(const std::array<float, 3>& normal, const Colour& albedo) const {
    const float up = 0.5F + 0.5F * normal[1];
    const float facesKey = std::max(0.0F, dot(normal, towardsKey));
    const float highlight = sheen * raised(std::max(0.0F, dot(normal, halfway)), 24);
    const float turnedAway = raised(1.0F - std::clamp(normal[2], 0.0F, 1.0F), 4);
    Colour colour{};
    for (std::size_t channel = 0; channel < colour.size(); ++channel) {
        const float sky = skyBelow[channel] + up * (skyAbove[channel] - skyBelow[channel]);
        const float arriving = key[channel] * facesKey + sky;
        colour[channel] =
            shown(0.5F * albedo[channel] * arriving + rim[channel] * turnedAway + key[channel] * highlight);
    }
    return colour;
}

float RasterLight::ofHeat(const std::array<float, 3>& normal) {
    return 255.0F * (0.8F + 0.2F * std::clamp(normal[2], 0.0F, 1.0F));
}

Colour RasterLight::linear(const Colour& srgb) {
    return {decoded(srgb[0]), decoded(srgb[1]), decoded(srgb[2])};
}

} // namespace viewer
