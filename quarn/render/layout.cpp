// SPDX-License-Identifier: Apache-2.0
#include "quarn/render/layout.h"

#include "quarn/console/numberText.h"
#include "quarn/render/heat.h"
#include "quarn/render/shade.h"
#include "quarn/render/text.h"

#include <algorithm>

namespace quarn {
namespace {

constexpr Vec3 ink{0.20F, 0.22F, 0.25F};

constexpr double around = 0.06; // of a close-up, on every side

// all sizes follow the panel's shorter side
float labelHeight(const Layout& layout) {
    return std::max(8.0F, static_cast<float>(std::min(layout.width, layout.height)) * 0.032F);
}

float tickHeight(const Layout& layout) {
    return 0.75F * labelHeight(layout);
}

void drawCentred(Picture& picture, const std::string& text, float middle, float top, float height) {
    drawText(picture, text, middle - textWidth(text, height) / 2.0F, top, height, ink);
}

// veils what a close-up shows behind words; on the background it cannot be seen
void drawPlate(Picture& picture, const Layout& layout, int left, int top, int bottom) {
    if (!layout.isCloseUp)
        return;
    for (int y = top; y < bottom; ++y)
        for (int x = 0; x < layout.width; ++x)
            picture.paint(left + x, y,
                          backgroundColour((static_cast<float>(y) + 0.5F) / static_cast<float>(layout.height)), 0.75F);
}

} // namespace

Margins Layout::margins() const {
    Margins margins;
    const double label = static_cast<double>(labelHeight(*this)) / height;
    if (hasLabels)
        margins.top = std::max(margins.top, 2.8 * label);
    if (hasColourBar)
        margins.bottom = std::max(margins.bottom, 4.0 * label);
    if (isCloseUp) {
        margins.sides += around;
        margins.top += around;
        margins.bottom += around;
    }
    return margins;
}

void drawLabel(Picture& picture, const Layout& layout, int left, const std::string& label) {
    const float height = labelHeight(layout);
    const auto width = static_cast<float>(layout.width);
    drawPlate(picture, layout, left, 0, static_cast<int>(2.8F * height));
    drawCentred(picture, fittingText(label, height, 0.94F * width), static_cast<float>(left) + width / 2.0F,
                0.9F * height, height);
}

void drawColourBar(Picture& picture, const Layout& layout, int left, double range) {
    const float unit = labelHeight(layout);
    const int length = layout.width / 2;
    const int first = left + (layout.width - length) / 2;
    const int top = layout.height - static_cast<int>(3.0F * unit);
    const int bottom = top + std::max(3, static_cast<int>(0.65F * unit));
    drawPlate(picture, layout, left, layout.height - static_cast<int>(4.0F * unit), layout.height);
    for (int x = 0; x < length; ++x)
        for (int y = top; y < bottom; ++y)
            picture.paint(first + x, y, heatColour((static_cast<float>(x) + 0.5F) / static_cast<float>(length)));
    const float ticksTop = static_cast<float>(bottom) + 0.5F * unit;
    for (const double part : {0.0, 0.5, 1.0}) {
        const float middle = static_cast<float>(first) + static_cast<float>(part) * static_cast<float>(length);
        const std::string text = numberText(part * range);
        drawCentred(picture, text, middle, ticksTop, tickHeight(layout));
        if (part == 1.0)
            drawText(picture, " mm", middle + textWidth(text, tickHeight(layout)) / 2.0F, ticksTop, tickHeight(layout),
                     ink);
    }
}

} // namespace quarn
