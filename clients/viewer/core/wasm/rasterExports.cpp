// SPDX-License-Identifier: Apache-2.0
// What a page without WebGL2 calls to see its character.
#include "openCharacter.h"
#include "viewer/Raster.h"

#include <algorithm>
#include <cstdint>

namespace {

using viewer::Shape;

viewer::Colour colourOf(std::uint32_t code) {
    const auto channel = [code](unsigned shift) { return static_cast<float>(code >> shift & 0xFFU) / 255.0F; };
    return {channel(16), channel(8), channel(0)};
}

viewer::RasterSurface surfaceOf(const viewer::Character& open, Shape shape, bool hasHeat) {
    viewer::RasterSurface surface{open.drawPoints(shape), open.drawNormals(shape), open.triangles()};
    if (hasHeat)
        surface.errors = open.drawErrors(shape);
    return surface;
}

} // namespace

/// Draws a shape of the character into columns `left` to `right` - 1 of a picture, which is cleared there and kept
/// elsewhere. `matrices` [32]: those of viewer::RasterCamera, the view first. `hasHeat` 1: by the errors of the shape,
/// where there are any, red at `range` mm; else in `colour`, 0xRRGGBB. Gives Raster::rgba(); null for a shape that is
/// not there and whatever Raster::draw() refuses.
extern "C" __attribute__((export_name("nw_raster"))) const std::uint8_t*
nw_raster(std::uint32_t width, std::uint32_t height, const float* matrices, Shape shape, std::uint32_t hasHeat,
          float range, std::uint32_t colour, std::uint32_t left, std::uint32_t right) {
    static viewer::Raster raster;
    const viewer::Character* const open = viewer::openCharacter();
    if (open == nullptr || open->drawPoints(shape).empty())
        return nullptr;
    viewer::RasterCamera camera{};
    std::copy_n(matrices, camera.view.size(), camera.view.begin());
    std::copy_n(matrices + camera.view.size(), camera.projection.size(), camera.projection.begin());
    viewer::RasterSurface surface = surfaceOf(*open, shape, hasHeat != 0);
    surface.range = range;
    surface.colour = colourOf(colour);
    return raster.draw({width, height, left, right}, camera, surface) ? raster.rgba() : nullptr;
}
