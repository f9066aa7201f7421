// SPDX-License-Identifier: Apache-2.0
#include "quarn/render/Picture.h"

#include <algorithm>
#include <cmath>
#include <stdexcept>

#define STB_IMAGE_WRITE_IMPLEMENTATION
#define STB_IMAGE_WRITE_STATIC
#define STBI_WRITE_NO_STDIO
#include <stb_image_write.h>

namespace quarn {
namespace {

std::uint8_t blended(std::uint8_t below, float above, float cover) {
    const float value = static_cast<float>(below) / 255.0F * (1.0F - cover) + above * cover;
    return static_cast<std::uint8_t>(std::lround(std::clamp(value, 0.0F, 1.0F) * 255.0F));
}

// IEC 61966-2-1
float encodedChannel(float linear) {
    return linear <= 0.0031308F ? 12.92F * linear : 1.055F * std::pow(linear, 1.0F / 2.4F) - 0.055F;
}

float decodedChannel(float srgb) {
    return srgb <= 0.04045F ? srgb / 12.92F : std::pow((srgb + 0.055F) / 1.055F, 2.4F);
}

} // namespace

Picture::Picture(int wide, int high)
    : width(wide)
    , height(high)
    , rgb(3 * static_cast<std::size_t>(wide) * static_cast<std::size_t>(high)) {}

void Picture::paint(int x, int y, const Vec3& colour, float cover) {
    if (x < 0 || y < 0 || x >= width || y >= height)
        return;
    std::uint8_t* pixel =
        &rgb[3 * (static_cast<std::size_t>(y) * static_cast<std::size_t>(width) + static_cast<std::size_t>(x))];
    pixel[0] = blended(pixel[0], colour.x, cover);
    pixel[1] = blended(pixel[1], colour.y, cover);
    pixel[2] = blended(pixel[2], colour.z, cover);
}

Vec3 encoded(const Vec3& linear) {
    return {encodedChannel(linear.x), encodedChannel(linear.y), encodedChannel(linear.z)};
}

Vec3 decoded(const Vec3& srgb) {
    return {decodedChannel(srgb.x), decodedChannel(srgb.y), decodedChannel(srgb.z)};
}

void writePng(std::ostream& stream, const Picture& picture) {
    const auto append = [](void* to, void* bytes, int size) {
        static_cast<std::ostream*>(to)->write(static_cast<const char*>(bytes), size);
    };
    if (stbi_write_png_to_func(append, &stream, picture.width, picture.height, 3, picture.rgb.data(),
                               3 * picture.width) == 0)
        throw std::runtime_error("the picture cannot be made into a PNG file: out of memory");
}

} // namespace quarn
