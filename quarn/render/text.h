// SPDX-License-Identifier: Apache-2.0
// Words in pictures: a font of plain strokes, drawn smoothly at any size.
#pragma once

#include "quarn/render/Picture.h"

#include <string>
#include <string_view>

namespace quarn {

/// Width in pixels. `height` that of a capital letter, in pixels.
float textWidth(std::string_view text, float height);

/// Draws a line of text, ASCII; any other character of UTF-8 is a question mark. `left`, `top` of the first capital
/// letter's box, in pixels; `colour` sRGB. What does not fit into the picture is cut off.
void drawText(Picture& picture, std::string_view text, float left, float top, float height, const Vec3& colour);

/// The text, or as much of its beginning as fits into `width` with dots behind it.
std::string fittingText(std::string_view text, float height, float width);

} // namespace quarn
