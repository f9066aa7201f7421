// SPDX-License-Identifier: Apache-2.0
// The colours of a surface under lights that stand with the camera: those of the pictures that quarn renders, without
// shadows.
#pragma once

#include <array>

namespace viewer {

using Colour = std::array<float, 3>; ///< red, green, blue

/// From 0, light grey, over yellow to red at 1 and above; what is no number is 0. sRGB, 0 to 1.
Colour heatColour(float share);

/// Thread: any.
class RasterLight {
public:
    RasterLight();

    /// sRGB, 0 to 255, of a surface whose own colour is `albedo` (linear, 0 to 1). `normal` in camera space, of length
    /// 1; on a surface that is seen its z is above 0.
    Colour lit(const std::array<float, 3>& normal, const Colour& albedo) const;
    /// What colours of heat, 0 to 1, are multiplied by: light changes them little, so that they can be read.
    static float ofHeat(const std::array<float, 3>& normal);
    /// Linear, of sRGB from 0 to 1.
    static Colour linear(const Colour& srgb);

private:
    static constexpr float brightest = 4.0F;
    float shown(float light) const;
    std::array<float, 1026> shown_; ///< sRGB of light from 0 to `brightest`, bright light run into white softly
};

} // namespace viewer
