// SPDX-License-Identifier: Apache-2.0
#include "quarn/render/Subject.h"
#include "quarn/render/drawPanel.h"
#include "quarn/render/gather.h"
#include "quarn/render/heat.h"
#include "quarn/render/shade.h"

#include <gtest/gtest.h>
#include <oneapi/tbb/global_control.h>

#include <algorithm>
#include <numbers>
#include <sstream>

#define STB_IMAGE_IMPLEMENTATION
#define STB_IMAGE_STATIC
#define STBI_ONLY_PNG
#include <stb_image.h>

namespace {

using namespace quarn;
using std::numbers::pi;

constexpr int side = 96;

// of quads, and triangles at the poles
MeshFrame sphere() {
    constexpr std::uint32_t rings = 48;
    constexpr std::uint32_t segments = 96;
    MeshFrame frame;
    for (std::uint32_t ring = 0; ring <= rings; ++ring)
        for (std::uint32_t segment = 0; segment < segments; ++segment) {
            const double down = pi * ring / rings;
            const double around = 2 * pi * segment / segments;
            frame.points.insert(frame.points.end(),
                                {std::sin(down) * std::sin(around), std::cos(down), std::sin(down) * std::cos(around)});
        }
    for (std::uint32_t ring = 0; ring < rings; ++ring)
        for (std::uint32_t segment = 0; segment < segments; ++segment) {
            const std::uint32_t next = (segment + 1) % segments;
            frame.polygons.sizes.push_back(4);
            frame.polygons.corners.insert(frame.polygons.corners.end(),
                                          {ring * segments + segment, (ring + 1) * segments + segment,
                                           (ring + 1) * segments + next, ring * segments + next});
        }
    frame.polygons.vertexCount = frame.points.size() / 3;
    return frame;
}

Camera cameraFor(const MeshFrame& frame) {
    Subject subject(FrameOn::all, Framing(viewFrom("front", "y"), side, side, {}));
    subject.include({{frame}});
    return subject.camera();
}

PanelSight sightOf(const MeshFrame& frame, const Camera& camera) {
    Surface surface;
    addMesh(surface, frame.polygons, frame.points, camera);
    return gather(surface, camera, side, side);
}

double cover(const PanelSight& sight) {
    double sum = 0.0;
    for (const PixelSight& pixel : sight.pixels)
        sum += pixel.cover;
    return sum;
}

Picture pictureOf(const PanelFrame& frame, const Camera& camera) {
    Layout layout;
    layout.width = layout.height = side;
    Picture picture(side, side);
    drawPanel(picture, layout, 0, camera, {}, frame, {});
    return picture;
}

TEST(Trace, ASphereCoversItsSilhouette) {
    const MeshFrame ball = sphere();
    const Camera camera = cameraFor(ball);
    const double distance = camera.position.length();
    // the cone that touches a sphere of radius 1, cut at z = -1
    const double radius = 1.0 / std::sqrt(distance * distance - 1.0) / camera.tangentX * side / 2.0;
    EXPECT_NEAR(cover(sightOf(ball, camera)), pi * radius * radius, 0.005 * pi * radius * radius);
}

TEST(Trace, ASphereIsRoundAndLitFromTheKeyLight) {
    const MeshFrame ball = sphere();
    const PanelSight sight = sightOf(ball, cameraFor(ball));
    const auto at = [&](int x, int y) { return sight.pixels[std::size_t(y) * side + std::size_t(x)]; };
    const PixelSight middle = at(side / 2, side / 2);
    EXPECT_EQ(middle.cover, 1.0F);
    EXPECT_EQ(middle.skyOpen, 1.0F); // nothing hides the sky from a ball
    EXPECT_EQ(middle.keyOpen, 1.0F);
    EXPECT_GT(normalized(middle.normal).z, 0.999F);
    for (const PixelSight& pixel : sight.pixels)
        if (pixel.cover == 1.0F) {
            ASSERT_EQ(pixel.skyOpen, 1.0F);
        }
    EXPECT_GT(lightOf(at(side / 3, side / 3)).y, 2.0F * lightOf(at(side * 2 / 3, side * 3 / 4)).y);
}

TEST(Trace, ACubeIsFlatUpToItsRim) {
    MeshFrame cube;
    for (const double x : {0, 1})
        for (const double y : {0, 1})
            for (const double z : {0, 1})
                cube.points.insert(cube.points.end(), {x, y, z});
    cube.polygons = {8, {4, 4, 4, 4, 4, 4}, {0, 1, 3, 2, 4, 6, 7, 5, 0, 4, 5, 1, 2, 3, 7, 6, 0, 2, 6, 4, 1, 5, 7, 3}};
    const PanelSight sight = sightOf(cube, cameraFor(cube));
    EXPECT_GT(cover(sight), side * side / 4.0);
    for (const PixelSight& pixel : sight.pixels)
        if (pixel.cover > 0.0F) {
            ASSERT_GT(normalized(pixel.normal).z, 0.9999F);
        }
}

TEST(Trace, AShelfShadowsTheWallBelowIt) {
    MeshFrame shelf; // a wall that faces the viewer, and a shelf in front of its middle
    shelf.points = {-1, -1, 0, 1, -1, 0, 1, 1, 0, -1, 1, 0, -1, 0, 0, 1, 0, 0, 1, 0, 1, -1, 0, 1};
    shelf.polygons = {8, {4, 4}, {0, 1, 2, 3, 4, 5, 6, 7}};
    PanelSight sight = sightOf(shelf, cameraFor(shelf));
    smoothLight(sight);
    const PixelSight& above = sight.pixels[side * 24 + side / 2];
    const PixelSight& below = sight.pixels[side * 56 + side / 2];
    ASSERT_EQ(above.cover, 1.0F);
    ASSERT_EQ(below.cover, 1.0F);
    EXPECT_EQ(above.keyOpen, 1.0F);
    EXPECT_EQ(below.keyOpen, 0.0F);
    EXPECT_GT(above.skyOpen, 0.8F);
    EXPECT_LT(below.skyOpen, 0.7F);
}

TEST(Trace, TheSameBytesWithAnyNumberOfThreads) {
    MeshFrame ball = sphere();
    ball.distances.assign(ball.points.size() / 3, 0.3);
    const Camera camera = cameraFor(ball);
    const std::vector<std::uint8_t> expected = pictureOf({ball}, camera).rgb;
    for (const std::size_t threads : {1U, 2U, 7U}) {
        const oneapi::tbb::global_control limit(oneapi::tbb::global_control::max_allowed_parallelism, threads);
        EXPECT_TRUE(pictureOf({ball}, camera).rgb == expected) << threads;
    }
}

TEST(Trace, BothSidesAreShownAlike) {
    const MeshFrame ball = sphere();
    MeshFrame insideOut = ball;
    std::reverse(insideOut.polygons.corners.begin(), insideOut.polygons.corners.end());
    const Camera camera = cameraFor(ball);
    const std::vector<std::uint8_t> outside = pictureOf({ball}, camera).rgb;
    const std::vector<std::uint8_t> inside = pictureOf({insideOut}, camera).rgb;
    int largest = 0;
    for (std::size_t i = 0; i < outside.size(); ++i)
        largest = std::max(largest, std::abs(outside[i] - inside[i]));
    EXPECT_LE(largest, 12); // other diagonals of the quads: the last of the lit rim may differ a little
}

// colours of two meshes, one of which has no distance, must be those of the scale, whatever light and shadow do
TEST(Trace, HeatHasTheColourOfItsDistanceEverywhere) {
    MeshFrame ball = sphere();
    const Camera camera = cameraFor(ball);
    MeshFrame other = ball;
    for (std::size_t i = 0; i < ball.points.size(); i += 3) {
        ball.points[i] = 0.5 * ball.points[i] - 0.5;
        other.points[i] = 0.5 * other.points[i] + 0.5;
    }
    ball.distances.assign(ball.points.size() / 3, 0.25);
    const Picture picture = pictureOf({ball, other}, camera);
    const auto isNear = [&](int x, int y, const Vec3& colour) {
        const std::uint8_t* pixel = &picture.rgb[3 * (std::size_t(y) * side + std::size_t(x))];
        return std::abs(pixel[0] / 255.0F - colour.x) < 0.02F && std::abs(pixel[1] / 255.0F - colour.y) < 0.02F &&
               std::abs(pixel[2] / 255.0F - colour.z) < 0.02F;
    };
    for (const int y : {side * 2 / 5, side / 2, side * 3 / 5}) {
        EXPECT_TRUE(isNear(side * 3 / 10, y, heatColour(0.25F))) << y;
        EXPECT_TRUE(isNear(side * 7 / 10, y, unmeasuredColour)) << y;
    }
    int dark = 0; // the outline, and where one ball ends in front of the other
    for (int x = 0; x < side; ++x)
        dark += picture.rgb[3 * (std::size_t(side / 2) * side + std::size_t(x))] < 160 ? 1 : 0;
    EXPECT_GE(dark, 1);
}

TEST(Trace, NothingToSeeIsTheBackground) {
    MeshFrame lines;
    const std::vector<std::uint8_t> empty = pictureOf({lines}, cameraFor(lines)).rgb;
    lines.points = {0, 0, 0, 1, 0, 0, 0, 1, 0};
    lines.polygons = {3, {2, 2}, {0, 1, 1, 2}};
    EXPECT_EQ(pictureOf({lines}, cameraFor(lines)).rgb, empty);
    lines.polygons = {3, {3, 4}, {0, 0, 0, 1, 1, 2, 2}}; // without any area
    EXPECT_EQ(pictureOf({lines}, cameraFor(lines)).rgb, empty);
    lines.points.assign(9, 5.0);
    lines.polygons = {3, {3}, {0, 1, 2}};
    EXPECT_EQ(pictureOf({lines}, cameraFor(lines)).rgb, empty);
}

TEST(Trace, DegenerateTrianglesChangeNothing) {
    MeshFrame ball = sphere();
    const Camera camera = cameraFor(ball);
    const double before = cover(sightOf(ball, camera));
    ball.polygons.sizes.insert(ball.polygons.sizes.end(), {3, 2, 3});
    ball.polygons.corners.insert(ball.polygons.corners.end(), {500, 500, 500, 600, 601, 700, 701, 700});
    EXPECT_EQ(cover(sightOf(ball, camera)), before);
}

TEST(Png, ReadsBackAsItWasPainted) {
    Picture picture(37, 11);
    for (int y = 0; y < 11; ++y)
        for (int x = 0; x < 37; ++x)
            picture.paint(x, y, {static_cast<float>(x) / 37.0F, static_cast<float>(y) / 11.0F, 0.5F});
    std::ostringstream stream;
    writePng(stream, picture);
    const std::string bytes = stream.str();
    int width = 0;
    int height = 0;
    int channels = 0;
    stbi_uc* pixels = stbi_load_from_memory(reinterpret_cast<const stbi_uc*>(bytes.data()),
                                            static_cast<int>(bytes.size()), &width, &height, &channels, 3);
    ASSERT_NE(pixels, nullptr);
    EXPECT_EQ(width, 37);
    EXPECT_EQ(height, 11);
    EXPECT_TRUE(std::equal(picture.rgb.begin(), picture.rgb.end(), pixels));
    stbi_image_free(pixels);
}

} // namespace
