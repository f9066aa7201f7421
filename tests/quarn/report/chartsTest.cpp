// SPDX-License-Identifier: Apache-2.0
// Charts are XML, and what is drawn lies in the picture, whatever the values are.
#include "quarn/report/charts.h"
#include "quarn/report/escaped.h"

#include <gmock/gmock.h>
#include <pugixml.hpp>

#include <cmath>
#include <functional>
#include <sstream>

namespace quarn {
namespace {

using ::testing::DoubleNear;
using ::testing::Pointwise;

std::vector<std::pair<double, double>> pointsOf(const pugi::xml_node& line) {
    std::istringstream text(line.attribute("points").value());
    std::vector<std::pair<double, double>> points;
    char comma = 0;
    for (double x = 0, y = 0; text >> x >> comma >> y;)
        points.emplace_back(x, y);
    return points;
}

pugi::xml_document parsed(const std::string& svg) {
    pugi::xml_document document;
    EXPECT_TRUE(document.load_string(svg.c_str())) << svg;
    return document;
}

TEST(Charts, DrawWhateverTheyAreGiven) {
    std::vector<double> many(5000, 1e-3);
    many[1234] = 7.0; // is not lost between the columns
    for (const std::vector<double>& values :
         {std::vector<double>{0.5}, {0.0, 0.0}, {1e-9, 1e9, 0.0}, {3.0, 3.0, 3.0}, many}) {
        const LineChart chart{"<title> & \"more\"",
                              {{0.0, 1.0}, "x"},
                              {logScaleOf({&values}), "y"},
                              {{"one", "before", false, values}, {"two", "after", true, {1.0}}},
                              0.5,
                              "best"};
        const pugi::xml_document document = parsed(svgOf(chart));
        EXPECT_STREQ(document.child("svg").child("text").text().get(), chart.title.c_str());
        double highest = 1e9;
        for (const pugi::xml_node& line : document.child("svg").children("polyline")) {
            const auto points = pointsOf(line);
            EXPECT_GE(points.size(), 2U);
            EXPECT_LE(points.size(), 480U);
            for (const auto& [x, y] : points) {
                EXPECT_TRUE(x >= 64 && x <= 548 && y >= 56 && y <= 254) << x << " " << y;
                highest = std::min(highest, y);
            }
        }
        if (values.size() > 10) {
            EXPECT_LT(highest, 66) << "7 of 10 at the top";
        }
    }
    BarChart bars;
    bars.x.scale = {1.0, 100.0, true};
    bars.bars = {{"a", "before", {0.0, 5.0, 10.0}}, {"b", "after", {0, 0, 0}}};
    std::vector<double> heights;
    const pugi::xml_document drawn = parsed(svgOf(bars));
    for (const pugi::xml_node& bar : drawn.child("svg").children("rect"))
        heights.push_back(bar.attribute("height").as_double());
    ASSERT_EQ(heights.size(), 2U);
    EXPECT_NEAR(heights[1], 2 * heights[0], 0.2);
}

TEST(Charts, TextsAreNoMarkup) {
    EXPECT_EQ(escaped("<b a='x' c=\"y\">&amp;\x1b\xff</b>"),
              "&lt;b a=&#39;x&#39; c=&quot;y&quot;&gt;&amp;amp;\\u001b\\u00ff&lt;/b&gt;");
}

TEST(Charts, ScalesHaveRoundNumbers) {
    const auto ticks = [](const Scale& scale, const std::vector<double>& wanted) {
        EXPECT_THAT(scale.ticks(), Pointwise(DoubleNear(1e-9), wanted));
    };
    ticks({1.0, 120.0}, {20, 40, 60, 80, 100, 120});
    ticks({0.0, 1.05}, {0, 0.2, 0.4, 0.6, 0.8, 1.0});
    ticks({-10.0, -4.0}, {-10, -9, -8, -7, -6, -5, -4});
    ticks({0.1, 1.0, true}, {0.1, 0.2, 0.5, 1});
    ticks({1e-3, 10.0, true}, {1e-3, 1e-2, 0.1, 1, 10});
    EXPECT_FALSE(std::signbit(Scale{0.0, 1.0}.ticks().front()));
    EXPECT_DOUBLE_EQ((Scale{1.0, 100.0, true}.place(10.0)), 0.5);
    EXPECT_EQ((Scale{1.0, 100.0, true}.place(0.0)), 0.0);
    EXPECT_EQ((Scale{0.0, 10.0}.place(20.0)), 1.0);
    const std::vector<double> values{0.0, 0.03, 4.0, 1e-12};
    EXPECT_DOUBLE_EQ(logScaleOf({&values}, 4).first, 1e-3);
    EXPECT_DOUBLE_EQ(logScaleOf({&values}, 4).last, 10.0);
}

} // namespace
} // namespace quarn
