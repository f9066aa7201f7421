// SPDX-License-Identifier: Apache-2.0
#include "viewer/Raster.h"

#include <gmock/gmock.h>

#include <cmath>
#include <limits>
#include <random>

namespace {

using namespace viewer;

constexpr float nan = std::numeric_limits<float>::quiet_NaN();
constexpr std::array<float, 16> identity{1, 0, 0, 0, 0, 1, 0, 0, 0, 0, 1, 0, 0, 0, 0, 1};
constexpr RasterCamera straight{identity, identity};

// from the origin along -z, as wide as it is high; 1 up or to the side at distance 1 is the picture's edge
RasterCamera perspective(float nearPlane, float farPlane) {
    const float depth = farPlane - nearPlane;
    return {identity,
            {1, 0, 0, 0, 0, 1, 0, 0, 0, 0, -(farPlane + nearPlane) / depth, -1, 0, 0, -2 * farPlane * nearPlane / depth,
             0}};
}

struct Mesh {
    std::vector<float> points, normals, errors;
    std::vector<std::uint32_t> triangles;

    // a corner of a new triangle, in pixels of a picture of that size
    void add(double x, double y, float z, double size, float error = 0.0F) {
        addPoint({static_cast<float>(2.0 * x / size - 1.0), static_cast<float>(1.0 - 2.0 * y / size), z}, error);
        triangles.push_back(static_cast<std::uint32_t>(triangles.size()));
    }
    void addPoint(const std::array<float, 3>& point, float error = 0.0F) {
        points.insert(points.end(), point.begin(), point.end());
        normals.insert(normals.end(), {0, 0, 1});
        errors.push_back(error);
    }
    RasterSurface surface() const { return {points, normals, triangles, {}, 1.0F, {0.8F, 0.6F, 0.5F}}; }
    RasterSurface heat(float range = 1.0F) const { return {points, normals, triangles, errors, range, {}}; }
};

class Picture {
public:
    explicit Picture(std::uint32_t size)
        : size_(size) {}
    void draw(const RasterSurface& surface, const RasterCamera& camera = straight) {
        ASSERT_TRUE(raster_.draw({size_, size_, 0, size_}, camera, surface));
    }
    const std::uint8_t* at(std::uint32_t x, std::uint32_t y) const {
        return raster_.rgba() + 4 * (std::size_t{y} * size_ + x);
    }
    bool isCovered(std::uint32_t x, std::uint32_t y) const { return at(x, y)[3] != 0; }
    std::vector<std::uint8_t> bytes() const {
        return {raster_.rgba(), raster_.rgba() + std::size_t{4} * size_ * size_};
    }
    Raster& raster() { return raster_; }

private:
    std::uint32_t size_;
    Raster raster_;
};

void expectColour(const std::uint8_t* pixel, const Colour& srgb, double most, const std::string& where) {
    ASSERT_EQ(pixel[3], 255) << where;
    for (std::size_t channel = 0; channel < 3; ++channel)
        EXPECT_NEAR(pixel[channel], 255.0F * srgb[channel], most) << where << ", channel " << channel;
}

// 1 inside, -1 outside, 0 on an edge, in doubles that hold all of it
int sideOf(const std::array<double, 6>& t, double x, double y) {
    int least = 1, most = -1;
    for (std::size_t i = 0; i < 6; i += 2) {
        const std::size_t j = (i + 2) % 6;
        const double turn = (t[j] - t[i]) * (y - t[i + 1]) - (t[j + 1] - t[i + 1]) * (x - t[i]);
        const int sign = turn > 0.0 ? 1 : turn < 0.0 ? -1 : 0;
        least = std::min(least, sign);
        most = std::max(most, sign);
    }
    return least == most && least != 0 ? 1 : least < 0 && most > 0 ? -1 : 0;
}

// small ones and such as leave the picture, of both windings, a corner at a 256th of a pixel
TEST(Raster, PixelsAreThoseWhoseMiddleIsInside) {
    constexpr std::uint32_t size = 64;
    std::mt19937 random(5);
    Picture picture(size);
    for (int round = 0; round < 300; ++round) {
        const int reach = std::array{4, 40, 400, 4000}[static_cast<std::size_t>(round) % 4];
        std::array<double, 6> t{};
        for (double& place : t)
            place = 32.0 + std::uniform_int_distribution<int>(-256 * reach, 256 * reach)(random) / 256.0;
        Mesh mesh;
        for (std::size_t i = 0; i < 6; i += 2)
            mesh.add(t[i], t[i + 1], 0.0F, size);
        picture.draw(mesh.surface());
        for (std::uint32_t y = 0; y < size; ++y)
            for (std::uint32_t x = 0; x < size; ++x)
                if (const int side = sideOf(t, x + 0.5, y + 0.5); side != 0) {
                    ASSERT_EQ(picture.isCovered(x, y), side > 0) << round << ": " << x << ' ' << y;
                }
    }
}

// all corners are in the middle of pixels, so that many edges go through others
TEST(Raster, PixelsOnSharedEdgesBelongToOneTriangle) {
    constexpr std::uint32_t size = 32, cells = 6;
    std::mt19937 random(7);
    std::array<std::array<std::array<double, 2>, cells + 1>, cells + 1> grid{};
    for (std::uint32_t row = 0; row <= cells; ++row)
        for (std::uint32_t column = 0; column <= cells; ++column) {
            const auto shifted = [&](std::uint32_t i) {
                const bool isInner = row % cells != 0 && column % cells != 0;
                return 4.5 + 4.0 * i + (isInner ? std::uniform_int_distribution<int>(-1, 1)(random) : 0);
            };
            grid[row][column] = {shifted(column), shifted(row)};
        }
    std::vector<int> times(std::size_t{size} * size);
    for (std::uint32_t row = 0; row < cells; ++row)
        for (std::uint32_t column = 0; column < cells; ++column)
            for (const auto& corners : {std::array{0U, 1U, 2U}, std::array{3U, 2U, 1U}}) {
                Mesh mesh;
                for (const unsigned corner : corners) {
                    const auto& place = grid[row + corner / 2][column + corner % 2];
                    mesh.add(place[0], place[1], 0.0F, size);
                }
                Picture picture(size);
                picture.draw(mesh.surface());
                for (std::uint32_t i = 0; i < size * size; ++i)
                    times[i] += picture.isCovered(i % size, i / size) ? 1 : 0;
            }
    // from the middle of pixel 4 to that of pixel 28: left and top edges are in, right and bottom ones out
    for (std::uint32_t i = 0; i < size * size; ++i)
        EXPECT_EQ(times[i], i % size >= 4 && i % size < 28 && i / size >= 4 && i / size < 28 ? 1 : 0)
            << i % size << ' ' << i / size;
}

TEST(Raster, TheNearerIsSeenInAnyOrder) {
    constexpr std::uint32_t size = 32;
    // two that go through each other: one is nearer on the left, the other on the right of the middle
    const auto scene = [](bool isSwapped) {
        Mesh mesh;
        for (const bool second : {isSwapped, !isSwapped})
            for (const auto& [x, y] : {std::pair{0.0, 0.0}, std::pair{0.0, 32.0}, std::pair{64.0, 0.0}}) {
                const auto tilt = static_cast<float>(0.4 * (x / 32.0 - 0.5));
                mesh.add(x, y, second ? tilt : -tilt, size, second ? 1.0F : 0.0F);
            }
        return mesh;
    };
    Picture one(size), other(size);
    one.draw(scene(false).heat());
    other.draw(scene(true).heat());
    for (std::uint32_t x = 0; x < 28; ++x) {
        if (x == 15 || x == 16) // as near, all but
            continue;
        expectColour(one.at(x, 1), heatColour(x < 16 ? 1.0F : 0.0F), 1.0, std::to_string(x));
        expectColour(other.at(x, 1), heatColour(x < 16 ? 1.0F : 0.0F), 1.0, std::to_string(x));
    }
}

// A floor that goes from behind the viewer to beyond the far plane: per pixel, the ray knows what it hits.
TEST(Raster, PlanesCutOffAndColoursAreInPerspective) {
    constexpr std::uint32_t size = 64;
    constexpr float nearPlane = 0.9F, farPlane = 8.0F, below = -0.5F;
    Mesh floor;
    for (const auto& [x, z] : {std::pair{-30.0F, 20.0F}, {30.0F, 20.0F}, {30.0F, -20.0F}, {-30.0F, -20.0F}})
        floor.addPoint({x, below, z}, 20.0F - z);
    floor.triangles = {0, 1, 2, 0, 2, 3};
    for (std::size_t i = 1; i < floor.normals.size(); i += 3)
        floor.normals[i] = 1.0F, floor.normals[i + 1] = 0.0F;
    Picture picture(size);
    picture.draw(floor.heat(30.0F), perspective(nearPlane, farPlane));
    std::size_t seen = 0;
    for (std::uint32_t y = 0; y < size; ++y)
        for (std::uint32_t x = 0; x < size; ++x) {
            const double slope = 1.0 - 2.0 * (y + 0.5) / size;
            const double distance = slope < 0.0 ? static_cast<double>(below) / slope : 1e9;
            const std::string where = std::to_string(x) + ' ' + std::to_string(y);
            const bool isIn = distance > static_cast<double>(nearPlane) && distance < static_cast<double>(farPlane);
            ASSERT_EQ(picture.isCovered(x, y), isIn) << where;
            if (!isIn)
                continue;
            ++seen;
            // light from ahead does not reach it
            Colour expected = heatColour((20.0F + static_cast<float>(distance)) / 30.0F);
            for (float& channel : expected)
                channel *= 0.8F;
            expectColour(picture.at(x, y), expected, 1.0, where);
        }
    EXPECT_GT(seen, size * size / 6);
}

TEST(Raster, ColumnsOutsideStayAsTheyWere) {
    constexpr std::uint32_t size = 40, split = 13;
    Mesh left, right;
    for (const auto& [x, y] : {std::pair{-10.0, 2.0}, std::pair{20.0, 38.0}, std::pair{60.0, 5.0}}) {
        left.add(x, y, 0.1F, size, 1.0F);
        right.add(x + 3.0, 41.0 - y, 0.9F, size, 0.0F);
    }
    Picture wholeLeft(size), wholeRight(size), both(size);
    wholeLeft.draw(left.heat());
    wholeRight.draw(right.heat());
    both.draw(right.heat()); // what a wipe before has left
    ASSERT_TRUE(both.raster().draw({size, size, 0, split}, straight, left.heat()));
    ASSERT_TRUE(both.raster().draw({size, size, split, size}, straight, right.heat()));
    for (std::uint32_t i = 0; i < size * size; ++i) {
        const Picture& expected = i % size < split ? wholeLeft : wholeRight;
        for (unsigned channel = 0; channel < 4; ++channel)
            ASSERT_EQ(both.at(i % size, i / size)[channel], expected.at(i % size, i / size)[channel]) << i;
    }
    ASSERT_TRUE(both.raster().draw({size + 1, size, 0, 0}, straight, left.heat()));
    EXPECT_THAT(
        std::vector<std::uint8_t>(both.raster().rgba(), both.raster().rgba() + std::size_t{4} * (size + 1) * size),
        testing::Each(0));
}

TEST(Raster, HeatEndsAtBothEndsOfTheRange) {
    const std::pair<float, Colour> cases[] = {{0.0F, {0.87F, 0.87F, 0.87F}}, {-3.0F, {0.87F, 0.87F, 0.87F}},
                                              {nan, {0.87F, 0.87F, 0.87F}},  {2.5F, {0.97F, 0.63F, 0.14F}},
                                              {5.0F, {0.70F, 0.04F, 0.09F}}, {1e30F, {0.70F, 0.04F, 0.09F}}};
    for (const auto& [error, expected] : cases) {
        Mesh mesh;
        for (const auto& [x, y] : {std::pair{-8.0, -8.0}, std::pair{-8.0, 40.0}, std::pair{40.0, -8.0}})
            mesh.add(x, y, 0.0F, 8, error);
        Picture picture(8);
        picture.draw(mesh.heat(5.0F));
        expectColour(picture.at(4, 4), expected, 0.51, std::to_string(error));
    }
}

// the side that the normals are not on is lit as if it had its own
TEST(Raster, BothSidesAreLit) {
    Mesh front;
    for (const auto& [x, y] : {std::pair{-8.0, -8.0}, std::pair{-8.0, 40.0}, std::pair{40.0, -8.0}})
        front.add(x, y, -1.0F, 8);
    front.normals = {0.3F, 0.8F, 0.6F, 0.3F, 0.8F, 0.6F, -0.6F, 0.0F, 0.8F};
    Picture one(8), other(8);
    RasterCamera moved = straight; // which turns no normal
    moved.view[12] = -0.25F;
    // straight on, in perspective, and cut by the near plane
    for (const auto& [depth, camera] :
         {std::pair{-1.0F, moved}, {-2.0F, perspective(0.1F, 9.0F)}, {1.0F, perspective(0.1F, 9.0F)}}) {
        front.points[8] = depth;
        Mesh back = front;
        std::swap(back.triangles[1], back.triangles[2]);
        for (float& number : back.normals)
            number *= -2.0F;
        one.draw(front.surface(), camera);
        other.draw(back.surface(), camera);
        EXPECT_THAT(other.bytes(), testing::Pointwise(testing::Truly([](const auto& both) {
                                                          return std::abs(std::get<0>(both) - std::get<1>(both)) <= 1;
                                                      }),
                                                      one.bytes()))
            << depth;
    }
    front.normals = {0.3F, 0.8F, 0.6F, 0.3F, 0.8F, 0.6F, 0.3F, 0.8F, 0.6F};
    front.points[8] = -1.0F;
    one.draw(front.surface());
    other.draw(front.surface(), moved);
    EXPECT_EQ(one.bytes(), other.bytes());
    std::fill(front.normals.begin(), front.normals.end(), nan);
    other.draw(front.surface());
    EXPECT_NE(one.bytes(), other.bytes());
    EXPECT_EQ(other.at(4, 4)[3], 255);
}

TEST(Raster, RefusesWhatIsNoPictureAndKeepsTheOneThatIs) {
    Mesh mesh;
    for (const auto& [x, y] : {std::pair{0.0, 0.0}, std::pair{0.0, 8.0}, std::pair{8.0, 0.0}})
        mesh.add(x, y, 0.0F, 8);
    Picture picture(8);
    EXPECT_EQ(picture.raster().rgba(), nullptr);
    picture.draw(mesh.surface());
    const std::vector<std::uint8_t> before = picture.bytes();
    constexpr std::uint32_t all = std::numeric_limits<std::uint32_t>::max();
    for (const RasterFrame& frame :
         {RasterFrame{0, 8, 0, 0}, RasterFrame{8, 0, 0, 8}, RasterFrame{8193, 8, 0, 8}, RasterFrame{8, all, 0, 8},
          RasterFrame{8, 8, 5, 4}, RasterFrame{8, 8, 0, 9}, RasterFrame{8, 8, all, all}})
        EXPECT_FALSE(picture.raster().draw(frame, straight, mesh.surface())) << frame.width << 'x' << frame.height;
    for (const float range : {0.0F, -1.0F, nan})
        EXPECT_FALSE(picture.raster().draw({8, 8, 0, 8}, straight, mesh.heat(range))) << range;
    for (const bool isView : {true, false}) {
        RasterCamera camera = straight;
        (isView ? camera.view : camera.projection)[6] = isView ? nan : std::numeric_limits<float>::infinity();
        EXPECT_FALSE(picture.raster().draw({8, 8, 0, 8}, camera, mesh.surface()));
    }
    EXPECT_EQ(picture.bytes(), before);
}

// numbers of any size end in a picture: what has no place is left out, what is huge covers all
TEST(Raster, SurvivesAnyPoints) {
    constexpr float huge = 1e12F, infinite = std::numeric_limits<float>::infinity();
    std::mt19937 random(11);
    Picture picture(32);
    for (int round = 0; round < 400; ++round) {
        Mesh mesh;
        for (int i = 0; i < 12; ++i) {
            std::array<float, 3> point{};
            for (float& number : point) {
                constexpr std::array<float, 12> odd{0,     1,      -1,       1e-30F, huge, -huge,
                                                    3e38F, -3e38F, infinite, nan,    0.5F, -1e-7F};
                number = odd[std::uniform_int_distribution<std::size_t>(0, odd.size() - 1)(random)];
            }
            mesh.addPoint(point, point[0]);
            mesh.triangles.push_back(static_cast<std::uint32_t>(i));
        }
        RasterCamera camera = round % 2 == 0 ? straight : perspective(1e-3F, 1e3F);
        if (round % 8 >= 6)
            for (float& number : camera.projection)
                number = std::uniform_real_distribution<float>(-1e3F, 1e3F)(random);
        picture.draw(round % 3 == 0 ? mesh.heat() : mesh.surface(), camera);
    }
    Mesh mesh;
    for (const auto& point :
         {std::array{-huge, -huge, 0.5F}, {huge, -huge, 0.5F}, {0.0F, huge, 0.5F}, {nan, 0.0F, 0.0F}})
        mesh.addPoint(point);
    mesh.triangles = {0, 1, 3, 0, 1, 2};
    picture.draw(mesh.surface());
    for (std::uint32_t i = 0; i < 32 * 32; ++i)
        ASSERT_TRUE(picture.isCovered(i % 32, i / 32)) << i;
}

} // namespace
