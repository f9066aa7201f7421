// SPDX-License-Identifier: Apache-2.0
// A picture of 8 bits a channel, and its file.
#pragma once

#include "quarn/render/Vec3.h"

#include <cstdint>
#include <ostream>
#include <vector>

namespace quarn {

/// sRGB, row by row from the top.
struct Picture {
    Picture(int width, int height);
    /// `colour` sRGB, each channel 0 to 1; `cover` 0 keeps the pixel as it is, 1 replaces it. What is outside of the
    /// picture is ignored.
    void paint(int x, int y, const Vec3& colour, float cover = 1.0F);

    int width;
    int height;
    std::vector<std::uint8_t> rgb;
};

/// Channel by channel, from linear light to sRGB and back.
Vec3 encoded(const Vec3& linear);
Vec3 decoded(const Vec3& srgb);

/// Writes a PNG file. Throws std::runtime_error when the memory is not enough; the state of `stream` is for the caller
/// to look at.
void writePng(std::ostream& stream, const Picture& picture);

} // namespace quarn
