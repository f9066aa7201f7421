// SPDX-License-Identifier: Apache-2.0
#include "quarn/render/shade.h"

#include "quarn/render/lights.h"

#include <algorithm>

namespace quarn {
namespace {

constexpr Vec3 backgroundTop{0.975F, 0.978F, 0.982F};
constexpr Vec3 backgroundBottom{0.895F, 0.905F, 0.92F};

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

} // namespace

Vec3 backgroundColour(float down) {
    return mix(backgroundTop, backgroundBottom, down);
}

Vec3 lightOf(const PixelSight& pixel, float evenLight) {
    const Vec3 normal = normalized(pixel.normal);
    const Vec3 toViewer = normalized(-pixel.position);
    const Vec3 sky = mix(lights::skyBelow, lights::skyAbove, 0.5F + 0.5F * normal.y);
    const Vec3 open{openWithBounces(pixel.skyOpen, pixel.albedo.x), openWithBounces(pixel.skyOpen, pixel.albedo.y),
                    openWithBounces(pixel.skyOpen, pixel.albedo.z)};
    const Vec3 even{evenLight, evenLight, evenLight};
    const Vec3 arriving = lights::key * (pixel.keyLight * pixel.keyOpen) + sky * open + even;
    const Vec3 halfway = normalized(toViewer + lights::towardsKey);
    const float highlight = power(std::max(0.0F, dot(normal, halfway)), 24) * pixel.keyOpen;
    const float turnedAway = power(1.0F - std::clamp(dot(normal, toViewer), 0.0F, 1.0F), 4);
    const Vec3 light = pixel.albedo * arriving * 0.5F + lights::rim * (turnedAway * pixel.skyOpen) +
                       lights::key * (lights::sheen * 0.5F * highlight);
    return {shoulder(light.x), shoulder(light.y), shoulder(light.z)};
}

void shade(const PanelSight& sight, Picture& picture, int left) {
    const float evenLight = sight.isHeat ? lights::evenLight : 0.0F;
    for (int y = 0; y < sight.height; ++y) {
        const Vec3 background = backgroundColour((static_cast<float>(y) + 0.5F) / static_cast<float>(sight.height));
        for (int x = 0; x < sight.width; ++x) {
            const PixelSight& pixel = sight.pixels[static_cast<std::size_t>(y) * static_cast<std::size_t>(sight.width) +
                                                   static_cast<std::size_t>(x)];
            picture.paint(left + x, y, background);
            if (pixel.cover > 0.0F)
                picture.paint(left + x, y, encoded(lightOf(pixel, evenLight)), pixel.cover);
        }
    }
}

} // namespace quarn
