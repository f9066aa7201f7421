// SPDX-License-Identifier: Apache-2.0
#include "quarn/render/shade.h"

#include "quarn/render/lights.h"

#include <algorithm>
#include <array>
#include <utility>

namespace quarn {
namespace {

constexpr Vec3 backgroundTop{0.975F, 0.978F, 0.982F};
constexpr Vec3 backgroundBottom{0.895F, 0.905F, 0.92F};

constexpr Vec3 line{0.25F, 0.26F, 0.30F};
constexpr float lineStrength = 0.6F;

// light that comes back from what hides the sky, the more the lighter the material is (J. Jimenez et al., "Practical
// Realtime Strategies for Accurate Indirect Occlusion", 2016, equation 10)
float openWithBounces(float open, float albedo) {
    const float a = 2.0404F * albedo - 0.3324F;
    const float b = -4.7951F * albedo + 0.6417F;
    const float c = 2.7552F * albedo + 0.6903F;
    return std::max(open, ((open * a + b) * open + c) * open);
}

// bright light runs into white softly
float shoulder(float value) {
    constexpr float knee = 0.6F;
    return value <= knee ? value : knee + (1.0F - knee) * (1.0F - std::exp(-(value - knee) / (1.0F - knee)));
}

float power(float base, int exponent) {
    float result = 1.0F;
    for (int i = 0; i < exponent; ++i)
        result *= base;
    return result;
}

// 0 inside of a smooth piece of surface, 1 where two of the four neighbours lie on none of it
float edgeAt(const PanelSight& sight, int x, int y) {
    constexpr std::array<std::pair<int, int>, 4> steps = {{{1, 0}, {-1, 0}, {0, 1}, {0, -1}}};
    const PixelSight& pixel = sight.at(x, y);
    float apart = 0.0F;
    for (const auto& [right, down] : steps) {
        if (x + right < 0 || x + right >= sight.width || y + down < 0 || y + down >= sight.height)
            continue;
        const PixelSight& other = sight.at(x + right, y + down);
        apart += other.cover > 0.0F ? 1.0F - pixel.kinship(other) : 1.0F;
    }
    return std::min(1.0F, 0.5F * apart);
}

// `colour` of the pixels that see the surface, sRGB
template <class Colour>
void paintPanel(const PanelSight& sight, Picture& picture, int left, Colour colour) {
    for (int y = 0; y < sight.height; ++y) {
        const Vec3 background = backgroundColour((static_cast<float>(y) + 0.5F) / static_cast<float>(sight.height));
        for (int x = 0; x < sight.width; ++x) {
            picture.paint(left + x, y, background);
            if (const float cover = sight.at(x, y).cover; cover > 0.0F)
                picture.paint(left + x, y, colour(x, y), cover);
        }
    }
}

} // namespace

Vec3 backgroundColour(float down) {
    return mix(backgroundTop, backgroundBottom, down);
}

Vec3 lightOf(const PixelSight& pixel) {
    const Vec3 normal = normalized(pixel.normal);
    const Vec3 toViewer = normalized(-pixel.position);
    const Vec3 sky = mix(lights::skyBelow, lights::skyAbove, 0.5F + 0.5F * normal.y);
    const Vec3 open{openWithBounces(pixel.skyOpen, pixel.albedo.x), openWithBounces(pixel.skyOpen, pixel.albedo.y),
                    openWithBounces(pixel.skyOpen, pixel.albedo.z)};
    const Vec3 arriving = lights::key * (pixel.keyLight * pixel.keyOpen) + sky * open;
    const Vec3 halfway = normalized(toViewer + lights::towardsKey);
    const float highlight = power(std::max(0.0F, dot(normal, halfway)), 24) * pixel.keyOpen;
    const float turnedAway = power(1.0F - std::clamp(dot(normal, toViewer), 0.0F, 1.0F), 4);
    const Vec3 light = pixel.albedo * arriving * 0.5F + lights::rim * (turnedAway * pixel.skyOpen) +
                       lights::key * (lights::sheen * 0.5F * highlight);
    return {shoulder(light.x), shoulder(light.y), shoulder(light.z)};
}

void shade(const PanelSight& sight, Picture& picture, int left) {
    paintPanel(sight, picture, left, [&](int x, int y) { return encoded(lightOf(sight.at(x, y))); });
}

void shadeFlat(const PanelSight& sight, Picture& picture, int left) {
    paintPanel(sight, picture, left, [&](int x, int y) {
        return mix(encoded(sight.at(x, y).albedo), line, lineStrength * edgeAt(sight, x, y));
    });
}

} // namespace quarn
