// SPDX-License-Identifier: Apache-2.0
#include "quarn/render/heat.h"
#include "quarn/console/numberText.h"
#include "quarn/render/Picture.h"
#include "quarn/render/layout.h"

#include <gtest/gtest.h>

#include <limits>

namespace {

using namespace quarn;

double lightness(const Vec3& srgb) {
    const Vec3 linear = decoded(srgb);
    return 0.2126 * linear.x + 0.7152 * linear.y + 0.0722 * linear.z;
}

TEST(Heat, ColoursGetDarkerAllTheWayAndEndsHold) {
    for (int i = 0; i < 200; ++i)
        EXPECT_GT(lightness(heatColour(static_cast<float>(i) / 200.0F)),
                  lightness(heatColour(static_cast<float>(i + 1) / 200.0F)))
            << i;
    const float infinity = std::numeric_limits<float>::infinity();
    EXPECT_EQ(heatColour(infinity).x, heatColour(1.0F).x);
    EXPECT_EQ(heatColour(-infinity).x, heatColour(0.0F).x);
    EXPECT_EQ(heatColour(std::numeric_limits<float>::quiet_NaN()).x, heatColour(0.0F).x);
}

TEST(Heat, RangesAreRoundedUpTo125) {
    const std::pair<double, double> cases[] = {{0.0, 1.0},   {-3.0, 1.0},  {1.0, 1.0},    {1.01, 2.0},  {2.0, 2.0},
                                               {2.5, 5.0},   {5.1, 10.0},  {10.09, 20.0}, {1000, 1000}, {0.003, 0.005},
                                               {0.02, 0.02}, {7e-9, 1e-8}, {0.5, 0.5}};
    for (const auto& [value, expected] : cases)
        EXPECT_NEAR(roundedUp(value), expected, 1e-12 * expected) << value;
    EXPECT_EQ(roundedUp(std::numeric_limits<double>::quiet_NaN()), 1.0);
}

TEST(Heat, NumbersOfTheBar) {
    EXPECT_EQ(numberText(0.0), "0");
    EXPECT_EQ(numberText(2.5), "2.5");
    EXPECT_EQ(numberText(0.05), "0.05");
    EXPECT_EQ(numberText(200.0), "200");
}

} // namespace
