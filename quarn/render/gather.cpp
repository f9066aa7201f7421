// SPDX-License-Identifier: Apache-2.0
// Tracing with a few rays a pixel: 8 into the scene and, from what they meet, one to the key light and 2 to the sky
// each. The rays of 4 x 4 neighbouring pixels complement one another; smoothLight() brings them together.
#include "quarn/render/gather.h"

#include "quarn/console/interrupt.h"
#include "quarn/render/Picture.h"
#include "quarn/render/RayScene.h"
#include "quarn/render/heat.h"
#include "quarn/render/lights.h"
#include "quarn/render/samples.h"

#include <oneapi/tbb/blocked_range.h>
#include <oneapi/tbb/parallel_for.h>

#include <algorithm>
#include <array>
#include <functional>

namespace quarn {
namespace {

constexpr unsigned raysPerPixel = 8;
constexpr unsigned skyRaysPerHit = 2;
constexpr float offset = 1e-4F; // rays begin this far from the surface; the viewer is 1 away

// no two rays in a row or column of an 8 x 8 grid
constexpr std::array<Sample2, raysPerPixel> inPixel = {{{0.0625F, 0.4375F},
                                                        {0.1875F, 0.8125F},
                                                        {0.3125F, 0.1875F},
                                                        {0.4375F, 0.6875F},
                                                        {0.5625F, 0.3125F},
                                                        {0.6875F, 0.9375F},
                                                        {0.8125F, 0.0625F},
                                                        {0.9375F, 0.5625F}}};

// which of the 16 patterns a pixel has
std::uint32_t patternOf(int x, int y) {
    constexpr std::array<std::uint32_t, 16> patterns = {0, 8, 2, 10, 12, 4, 14, 6, 3, 11, 1, 9, 15, 7, 13, 5};
    return patterns[4 * static_cast<std::size_t>(y & 3) + static_cast<std::size_t>(x & 3)];
}

// a place on the surface, seen from the viewer's side
struct Place {
    Vec3 position;
    Vec3 lifted; // from where rays start
    Vec3 normal;
    float heat = 0.0F;
};

class Tracer {
public:
    Tracer(const Surface& surface, const Camera& camera, int width, int height)
        : surface_(surface)
        , scene_(surface)
        , camera_(camera)
        , width_(width)
        , height_(height) {}

    PixelSight pixel(int x, int y) const;

private:
    Vec3 direction(int x, int y, const Sample2& inside) const;
    Place placeOf(const Hit& hit, const Vec3& ray) const;
    void addLight(PixelSight& sight, const Place& place, std::uint32_t sample) const;

    const Surface& surface_;
    RayScene scene_;
    const Camera& camera_;
    int width_;
    int height_;
};

Vec3 Tracer::direction(int x, int y, const Sample2& inside) const {
    const float right = (static_cast<float>(x) + inside.u) / static_cast<float>(width_);
    const float down = (static_cast<float>(y) + inside.v) / static_cast<float>(height_);
    return {(2.0F * right - 1.0F) * camera_.tangentX, (1.0F - 2.0F * down) * camera_.tangentY, -1.0F};
}

Place Tracer::placeOf(const Hit& hit, const Vec3& ray) const {
    const auto& corners = surface_.triangles[hit.triangle];
    const auto& normals = surface_.normals[hit.triangle];
    const std::array<float, 3> weights = {1.0F - hit.u - hit.v, hit.u, hit.v};
    Place place;
    place.position = ray * hit.distance;
    for (std::size_t corner = 0; corner < 3; ++corner)
        place.normal += normals.at(corner) * weights[corner];
    place.normal = normalized(place.normal);
    // both sides are shown: the one that is seen is the outside
    const Vec3 flat = dot(hit.normal, ray) > 0.0F ? -hit.normal : hit.normal;
    const float side = dot(place.normal, flat) < 0.0F ? -1.0F : 1.0F;
    place.normal = dot(place.normal, place.normal) > 0.0F ? place.normal * side : flat;
    // rays start on the round surface that the normals suggest, so that flat triangles do not shade each other
    // (J. Hanika, "Hacking the Shadow Terminator", Ray Tracing Gems II, 2021)
    place.lifted = place.position + flat * offset;
    for (std::size_t corner = 0; corner < 3; ++corner) {
        const Vec3 normal = normals.at(corner) * side;
        const float below = std::min(0.0F, dot(place.position - surface_.points[corners[corner]], normal));
        place.lifted += normal * (-below * weights[corner]);
    }
    if (!surface_.heat.empty())
        for (std::size_t corner = 0; corner < 3; ++corner)
            place.heat += surface_.heat[corners[corner]] * weights[corner];
    return place;
}

void Tracer::addLight(PixelSight& sight, const Place& place, std::uint32_t sample) const {
    const float cosine = dot(place.normal, lights::towardsKey);
    if (cosine > 0.0F) {
        const Sample2 at = spreadSample(sample);
        const Vec3 towards = directionAround(lights::towardsKey, 1.0F - at.u * (1.0F - lights::keyCone), at.v);
        sight.keyLight += cosine;
        sight.keyOpen += scene_.isBlocked(place.lifted, towards, 100.0F) ? 0.0F : 1.0F;
    } else {
        sight.keyOpen += 1.0F; // unlit already; a shadow here would only darken the neighbours' mean
    }
    for (std::uint32_t ray = 0; ray < skyRaysPerHit; ++ray) {
        const Sample2 at = spreadSample(sample * skyRaysPerHit + ray);
        const Vec3 towards = directionAround(place.normal, std::sqrt(1.0F - at.u), at.v); // by the cosine
        sight.skyOpen += scene_.isBlocked(place.lifted, towards, lights::skyReach) ? 0.0F : 1.0F / skyRaysPerHit;
    }
}

PixelSight Tracer::pixel(int x, int y) const {
    PixelSight sight;
    for (std::uint32_t ray = 0; ray < raysPerPixel; ++ray) {
        const Vec3 towards = direction(x, y, inPixel[ray]);
        const std::optional<Hit> hit = scene_.nearest({}, towards);
        if (!hit)
            continue;
        const Place place = placeOf(*hit, towards);
        sight.cover += 1.0F;
        sight.position += place.position;
        sight.normal += place.normal;
        if (!surface_.heat.empty()) {
            // three weights of a hit make 1 up to rounding alone, which differs from processor to processor
            sight.albedo += decoded(place.heat < unmeasured / 2 ? unmeasuredColour : heatColour(place.heat));
            continue;
        }
        sight.albedo += lights::clay;
        addLight(sight, place, patternOf(x, y) * raysPerPixel + ray);
    }
    if (sight.cover == 0.0F)
        return sight;
    const float share = 1.0F / sight.cover;
    sight.position = sight.position * share;
    sight.normal = sight.normal * share;
    sight.albedo = sight.albedo * share;
    sight.keyLight *= share;
    sight.keyOpen *= share;
    sight.skyOpen *= share;
    sight.cover /= raysPerPixel;
    return sight;
}

void forEachRow(int height, const std::function<void(int)>& work) {
    oneapi::tbb::parallel_for(oneapi::tbb::blocked_range<int>(0, height, 4),
                              [&](const oneapi::tbb::blocked_range<int>& rows) {
                                  throwIfInterrupted();
                                  for (int y = rows.begin(); y < rows.end(); ++y)
                                      work(y);
                              });
}

// a box of 4 x 4 pixels, which holds each pattern once, around the middle of the pixel
void smoothPixel(const PanelSight& from, PixelSight& pixel, int x, int y) {
    float weights = 0.0F;
    float key = 0.0F;
    float sky = 0.0F;
    for (int row = std::max(0, y - 2); row <= std::min(from.height - 1, y + 2); ++row)
        for (int column = std::max(0, x - 2); column <= std::min(from.width - 1, x + 2); ++column) {
            const PixelSight& other = from.at(column, row);
            if (other.cover == 0.0F)
                continue;
            const float edge = (std::abs(row - y) == 2 ? 0.5F : 1.0F) * (std::abs(column - x) == 2 ? 0.5F : 1.0F);
            const float weight = edge * other.cover * pixel.kinship(other);
            weights += weight;
            key += weight * other.keyOpen;
            sky += weight * other.skyOpen;
        }
    if (weights > 0.0F) {
        pixel.keyOpen = key / weights;
        pixel.skyOpen = sky / weights;
    }
}

} // namespace

float PixelSight::kinship(const PixelSight& other) const {
    const float alike = dot(normal, other.normal);
    if (alike <= 0.0F)
        return 0.0F;
    const float gap = std::abs(dot(normal, other.position - position));
    const float squared = alike * alike;
    return squared * squared * std::max(0.0F, 1.0F - gap / 0.01F);
}

PanelSight gather(const Surface& surface, const Camera& camera, int width, int height) {
    PanelSight sight{width, height, {}};
    sight.pixels.resize(static_cast<std::size_t>(width) * static_cast<std::size_t>(height));
    const Tracer tracer(surface, camera, width, height);
    forEachRow(height, [&](int y) {
        std::size_t at = static_cast<std::size_t>(y) * static_cast<std::size_t>(width);
        for (int x = 0; x < width; ++x)
            sight.pixels[at++] = tracer.pixel(x, y);
    });
    return sight;
}

void smoothLight(PanelSight& sight) {
    const PanelSight from = sight;
    forEachRow(sight.height, [&](int y) {
        std::size_t at = static_cast<std::size_t>(y) * static_cast<std::size_t>(sight.width);
        for (int x = 0; x < sight.width; ++x)
            if (PixelSight& pixel = sight.pixels[at++]; pixel.cover > 0.0F)
                smoothPixel(from, pixel, x, y);
    });
}

} // namespace quarn
