// SPDX-License-Identifier: Apache-2.0
#include "quarn/render/text.h"

#include "quarn/render/glyphs.h"

#include <algorithm>
#include <limits>

namespace quarn {
namespace {

constexpr float capital = 6.0F; // height of a capital letter in units of the glyphs
constexpr float pen = 0.42F;    // half the width of a stroke
constexpr float gap = 1.9F;     // between two characters
constexpr float blank = 2.2F;

bool continuesCharacter(char byte) {
    return (static_cast<unsigned char>(byte) & 0xC0U) == 0x80U;
}

std::string_view glyphOf(char character) {
    const int index = character - firstGlyph;
    const bool known = index >= 0 && index < static_cast<int>(glyphs.size());
    return glyphs[static_cast<std::size_t>(known ? index : static_cast<int>('?' - firstGlyph))];
}

float digit(char character) {
    return static_cast<float>(character - '0');
}

float glyphWidth(std::string_view glyph) {
    float width = 0.0F;
    for (std::size_t at = 0; at < glyph.size(); at += glyph[at] == ' ' ? 1U : 2U)
        if (glyph[at] != ' ')
            width = std::max(width, digit(glyph[at]));
    return width;
}

float advance(char character) {
    return character == ' ' ? blank + gap : glyphWidth(glyphOf(character)) + gap;
}

float distanceToSegment(float x, float y, std::string_view from, std::string_view to) {
    const float startX = digit(from[0]);
    const float startY = digit(from[1]);
    const float alongX = digit(to[0]) - startX;
    const float alongY = digit(to[1]) - startY;
    const float squared = alongX * alongX + alongY * alongY;
    const float part = squared > 0.0F ? ((x - startX) * alongX + (y - startY) * alongY) / squared : 0.0F;
    const float nearest = std::clamp(part, 0.0F, 1.0F);
    return std::hypot(x - startX - nearest * alongX, y - startY - nearest * alongY);
}

float distanceToGlyph(float x, float y, std::string_view glyph) {
    float distance = std::numeric_limits<float>::infinity();
    std::size_t begin = 0;
    while (begin < glyph.size()) {
        const std::size_t end = std::min(glyph.find(' ', begin), glyph.size());
        const std::string_view stroke = glyph.substr(begin, end - begin);
        for (std::size_t at = 0; at < stroke.size(); at += 2) {
            const std::size_t next = std::min(at + 2, stroke.size() - 2);
            distance = std::min(distance, distanceToSegment(x, y, stroke.substr(at, 2), stroke.substr(next, 2)));
        }
        begin = end + 1;
    }
    return distance;
}

// `unit` pixels of a unit of the glyphs
void drawGlyph(Picture& picture, std::string_view glyph, float left, float top, float unit, const Vec3& colour) {
    const float thickness = std::max(pen, 0.5F / unit); // no stroke is thinner than a pixel
    const int firstX = static_cast<int>(std::floor(left - unit));
    const int lastX = static_cast<int>(std::ceil(left + (glyphWidth(glyph) + 1.0F) * unit));
    const int firstY = static_cast<int>(std::floor(top - unit));
    const int lastY = static_cast<int>(std::ceil(top + 9.0F * unit));
    for (int y = firstY; y <= lastY; ++y)
        for (int x = firstX; x <= lastX; ++x) {
            const float glyphX = (static_cast<float>(x) + 0.5F - left) / unit;
            const float glyphY = (static_cast<float>(y) + 0.5F - top) / unit;
            const float inside = (thickness - distanceToGlyph(glyphX, glyphY, glyph)) * unit + 0.5F;
            if (inside > 0.0F)
                picture.paint(x, y, colour, std::min(inside, 1.0F));
        }
}

} // namespace

float textWidth(std::string_view text, float height) {
    float width = 0.0F;
    for (const char character : text)
        if (!continuesCharacter(character))
            width += advance(character);
    return text.empty() ? 0.0F : (width - gap) * height / capital;
}

void drawText(Picture& picture, std::string_view text, float left, float top, float height, const Vec3& colour) {
    const float unit = height / capital;
    float x = left;
    for (const char character : text) {
        if (continuesCharacter(character))
            continue;
        if (character != ' ')
            drawGlyph(picture, glyphOf(character), x, top, unit, colour);
        x += advance(character) * unit;
    }
}

std::string fittingText(std::string_view text, float height, float width) {
    if (textWidth(text, height) <= width)
        return std::string(text);
    while (!text.empty()) {
        text.remove_suffix(1);
        if (text.empty() || textWidth(std::string(text) + "..", height) <= width)
            break;
    }
    return std::string(text) + "..";
}

} // namespace quarn
