// SPDX-License-Identifier: Apache-2.0
#include "quarn/view/pagePicture.h"

#include <algorithm>
#include <cmath>
#include <limits>
#include <memory>
#include <stdexcept>

#define STB_IMAGE_IMPLEMENTATION
#define STB_IMAGE_STATIC
#define STBI_NO_STDIO
#define STBI_ONLY_PNG
#define STBI_ONLY_JPEG
#include <stb_image.h>
#define STB_IMAGE_RESIZE_IMPLEMENTATION
#define STB_IMAGE_RESIZE_STATIC
#include <stb_image_resize.h>
#define STB_IMAGE_WRITE_IMPLEMENTATION
#define STB_IMAGE_WRITE_STATIC
#define STBI_WRITE_NO_STDIO
#include <stb_image_write.h>

namespace quarn {
namespace {

constexpr std::int64_t mostDecoded = std::int64_t{1} << 27U; // pixels: half a gigabyte with alpha
constexpr int jpegQuality = 85;

struct Pixels {
    int width = 0, height = 0;
    int channels = 0; ///< of a pixel: 1 byte each, sRGB, alpha last
    bool losesAlpha = false;
    std::unique_ptr<unsigned char, void (*)(void*)> values{nullptr, &stbi_image_free};
};

const unsigned char* data(std::string_view bytes) {
    return reinterpret_cast<const unsigned char*>(bytes.data());
}

[[noreturn]] void refuse(const std::string& what) {
    throw std::runtime_error(what);
}

bool isJpeg(std::string_view bytes) {
    return bytes.starts_with("\xFF\xD8\xFF");
}

void checkSize(std::string_view bytes, Pixels& pixels) {
    if (bytes.size() > static_cast<std::size_t>(std::numeric_limits<int>::max()))
        refuse("has " + std::to_string(bytes.size()) + " bytes");
    if (stbi_info_from_memory(data(bytes), static_cast<int>(bytes.size()), &pixels.width, &pixels.height,
                              &pixels.channels) == 0)
        refuse("is no PNG or JPEG picture, or damaged");
    if (pixels.width < 1 || pixels.height < 1 || std::int64_t{pixels.width} * pixels.height > mostDecoded)
        refuse("has " + std::to_string(pixels.width) + " x " + std::to_string(pixels.height) +
               " pixels, which is too many");
}

Pixels decoded(std::string_view bytes, bool keepsAlpha) {
    Pixels pixels;
    checkSize(bytes, pixels);
    const bool hasAlpha = keepsAlpha && pixels.channels % 2 == 0;
    pixels.losesAlpha = !keepsAlpha && pixels.channels % 2 == 0;
    pixels.channels = hasAlpha ? STBI_rgb_alpha : STBI_rgb;
    int fileChannels = 0;
    pixels.values.reset(stbi_load_from_memory(data(bytes), static_cast<int>(bytes.size()), &pixels.width,
                                              &pixels.height, &fileChannels, pixels.channels));
    if (!pixels.values)
        refuse(std::string("is damaged: ") + stbi_failure_reason());
    return pixels;
}

void shrink(Pixels& pixels, int mostPixels) {
    const double factor = static_cast<double>(mostPixels) / std::max(pixels.width, pixels.height);
    const auto scaled = [&](int side) { return std::max(1, static_cast<int>(std::lround(factor * side))); };
    Pixels small;
    small.width = scaled(pixels.width);
    small.height = scaled(pixels.height);
    small.channels = pixels.channels;
    const std::size_t size =
        std::size_t{4} * static_cast<std::size_t>(small.width) * static_cast<std::size_t>(small.height);
    small.values.reset(static_cast<unsigned char*>(STBI_MALLOC(size)));
    const int alpha = small.channels == STBI_rgb_alpha ? 3 : STBIR_ALPHA_CHANNEL_NONE;
    if (!small.values ||
        stbir_resize_uint8_srgb(pixels.values.get(), pixels.width, pixels.height, 0, small.values.get(), small.width,
                                small.height, 0, small.channels, alpha, 0) == 0)
        throw std::bad_alloc();
    pixels = std::move(small);
}

void append(void* to, void* bytes, int size) {
    static_cast<std::string*>(to)->append(static_cast<const char*>(bytes), static_cast<std::size_t>(size));
}

PageTexture encoded(const Pixels& pixels, bool isJpeg) {
    PageTexture texture{isJpeg ? "image/jpeg" : "image/png",
                        {},
                        static_cast<std::uint32_t>(pixels.width),
                        static_cast<std::uint32_t>(pixels.height)};
    const unsigned char* values = pixels.values.get();
    const int isDone = isJpeg ? stbi_write_jpg_to_func(append, &texture.bytes, pixels.width, pixels.height,
                                                       pixels.channels, values, jpegQuality)
                              : stbi_write_png_to_func(append, &texture.bytes, pixels.width, pixels.height,
                                                       pixels.channels, values, pixels.channels * pixels.width);
    if (isDone == 0)
        throw std::bad_alloc();
    return texture;
}

} // namespace

PageTexture pagePicture(std::string_view bytes, std::uint32_t mostPixels, bool keepsAlpha) {
    Pixels pixels = decoded(bytes, keepsAlpha);
    const int most = static_cast<int>(std::min<std::uint32_t>(mostPixels, std::numeric_limits<int>::max()));
    const bool fits = std::max(pixels.width, pixels.height) <= most;
    if (!fits)
        shrink(pixels, most);
    PageTexture asItIs{isJpeg(bytes) ? "image/jpeg" : "image/png", std::string(bytes),
                       static_cast<std::uint32_t>(pixels.width), static_cast<std::uint32_t>(pixels.height)};
    if (fits && isJpeg(bytes))
        return asItIs;
    const bool isSame = fits && (pixels.channels == STBI_rgb_alpha || !pixels.losesAlpha);
    PageTexture png = isSame ? asItIs : encoded(pixels, false);
    if (pixels.channels == STBI_rgb_alpha)
        return png;
    // few colours, as of painted stripes, are small as PNG, and without blur
    PageTexture jpeg = encoded(pixels, true);
    return jpeg.bytes.size() < png.bytes.size() / 2 ? jpeg : png;
}

} // namespace quarn
