// SPDX-License-Identifier: Apache-2.0
#include "quarn/render/text.h"
#include "quarn/render/layout.h"

#include <gtest/gtest.h>

#include <set>

namespace {

using namespace quarn;

Picture drawn(const std::string& text, float left = 4.0F) {
    Picture picture(60, 40);
    drawText(picture, text, left, 6.0F, 18.0F, {1.0F, 1.0F, 1.0F});
    return picture;
}

TEST(Text, EveryCharacterHasInkOfItsOwnWithinItsWidth) {
    std::set<std::string> seen;
    for (char character = '!'; character <= '~'; ++character) {
        const std::string text(1, character);
        const Picture picture = drawn(text);
        EXPECT_TRUE(seen.emplace(picture.rgb.begin(), picture.rgb.end()).second) << text;
        const int right = 4 + static_cast<int>(textWidth(text, 18.0F)) + 4; // half a pen, and a smooth edge
        std::size_t ink = 0;
        for (int y = 0; y < picture.height; ++y)
            for (int x = 0; x < picture.width; ++x)
                if (picture.rgb[3 * (std::size_t(y) * std::size_t(picture.width) + std::size_t(x))] > 0) {
                    ++ink;
                    EXPECT_TRUE(x >= 2 && x <= right && y >= 4 && y <= 33) << text << ' ' << x << ' ' << y;
                }
        EXPECT_GT(ink, 4U) << text;
    }
}

TEST(Text, OtherCharactersAreOneQuestionMarkEach) {
    EXPECT_EQ(drawn("\xC3\xA4x").rgb, drawn("?x").rgb);
    EXPECT_EQ(drawn("\xE2\x82\xAC\t").rgb, drawn("??").rgb);
    EXPECT_EQ(textWidth("\xC3\xA4x", 10.0F), textWidth("?x", 10.0F));
}

TEST(Text, WhatDoesNotFitIsCutOff) {
    EXPECT_EQ(drawn("A", -500.0F).rgb, Picture(60, 40).rgb);
    EXPECT_NE(drawn("A", 57.0F).rgb, Picture(60, 40).rgb);
    EXPECT_EQ(fittingText("skin", 10.0F, 100.0F), "skin");
    const std::string cut = fittingText("a very long label of a panel", 10.0F, 100.0F);
    EXPECT_LE(textWidth(cut, 10.0F), 100.0F);
    EXPECT_EQ(cut.substr(cut.size() - 2), "..");
    EXPECT_EQ(cut.substr(0, 6), "a very");
}

// rows of a picture that were drawn upon, from the top
std::set<int> inkedRows(const Picture& picture) {
    std::set<int> rows;
    const std::size_t width = 3 * static_cast<std::size_t>(picture.width);
    for (std::size_t i = 0; i < picture.rgb.size(); ++i)
        if (picture.rgb[i] != 0)
            rows.insert(static_cast<int>(i / width));
    return rows;
}

TEST(Text, LabelsAndColourBarsStayInTheMargins) {
    for (const int height : {60, 480, 1080}) {
        Picture label(640, height), bar(640, height);
        const Layout labelled{640, height, true, false}, barred{640, height, false, true};
        drawLabel(label, labelled, 0, "Skin");
        drawColourBar(bar, barred, 0, 20.0);
        ASSERT_FALSE(inkedRows(label).empty() || inkedRows(bar).empty());
        EXPECT_LT(*inkedRows(label).rbegin(), labelled.margins().top * height) << height;
        EXPECT_GE(*inkedRows(bar).begin(), (1.0 - barred.margins().bottom) * height) << height;
    }
}

} // namespace
