// SPDX-License-Identifier: Apache-2.0
// What all arithmetic here takes for granted of the compiler.
#include <array>
#include <cstddef>
#include <gtest/gtest.h>

namespace {

struct Point {
    double x, y, z, w;
    bool operator==(const Point&) const = default;
};

// as the deformer does to points that the model leaves alone
[[gnu::noinline]] void goToSinglePrecision(Point* points, std::size_t count) {
    for (std::size_t i = 0; i < count; ++i) {
        Point p = points[i];
        p.x += static_cast<double>(static_cast<float>(p.x)) - p.x;
        p.y += static_cast<double>(static_cast<float>(p.y)) - p.y;
        p.z += static_cast<double>(static_cast<float>(p.z)) - p.z;
        points[i] = p;
    }
}

double inSinglePrecision(double x) {
    const volatile auto single = static_cast<float>(x);
    return x + (static_cast<double>(single) - x);
}

TEST(Rounding, ToFloatIsKeptWhereSeveralAreRoundedSideBySide) {
    std::array<Point, 3> points{{{0.1, 0.2, 0.3, 1.0}, {1.1, 2.2, 3.3, 1.0}, {-0.7, 0.6, 0.9, 1.0}}};
    auto expected = points;
    for (Point& p : expected)
        p = {inSinglePrecision(p.x), inSinglePrecision(p.y), inSinglePrecision(p.z), p.w};
    goToSinglePrecision(points.data(), points.size());
    EXPECT_EQ(points, expected);
}

} // namespace
