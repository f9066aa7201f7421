// SPDX-License-Identifier: Apache-2.0
#include "quarn/render/View.h"
#include "quarn/render/Framing.h"
#include "quarn/render/Subject.h"
#include "quarn/render/pictureNames.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <random>

namespace {

using namespace quarn;
using ::testing::HasSubstr;
using ::testing::ThrowsMessage;

void expectNear(const HVector& is, const HVector& expected, const std::string& what) {
    EXPECT_LT((is - expected).length(), 1e-12) << what << ": " << is.x << ' ' << is.y << ' ' << is.z;
}

TEST(View, NamedViewsAndAngles) {
    struct Case {
        const char* direction;
        const char* up;
        HVector viewer;
        HVector top;
    };
    const Case cases[] = {
        {"front", "y", {0, 0, 1}, {0, 1, 0}},  {"back", "y", {0, 0, -1}, {0, 1, 0}},
        {"right", "y", {1, 0, 0}, {0, 1, 0}},  {"left", "y", {-1, 0, 0}, {0, 1, 0}},
        {"top", "y", {0, 1, 0}, {0, 0, -1}},   {"bottom", "y", {0, -1, 0}, {0, 0, 1}},
        {"front", "z", {0, -1, 0}, {0, 0, 1}}, {"right", "z", {1, 0, 0}, {0, 0, 1}},
        {"front", "x", {0, 0, 1}, {1, 0, 0}},  {"90,0", "y", {1, 0, 0}, {0, 1, 0}},
        {"-270,0", "y", {1, 0, 0}, {0, 1, 0}}, {"0,90", "z", {0, 0, 1}, {0, 1, 0}},
    };
    for (const Case& c : cases) {
        const View view = viewFrom(c.direction, c.up);
        const std::string what = std::string(c.direction) + " with up " + c.up;
        expectNear(view.viewer, c.viewer, what);
        expectNear(view.up, c.top, what);
        expectNear(view.right ^ view.up, view.viewer, what);
    }
    for (const char* text : {"", "above", "30", "30,", "30,91", "nan,0", "30,15,2", "30 ,15"})
        EXPECT_THAT([&] { viewFrom(text, "y"); },
                    ThrowsMessage<std::runtime_error>(HasSubstr("\"" + std::string(text) + "\" is no view")));
    EXPECT_THAT([] { viewFrom("front", "w"); }, ThrowsMessage<std::runtime_error>(HasSubstr("write x, y or z")));
}

TEST(Framing, SeesAllPointsWithinTheMarginsAndTouchesThem) {
    std::mt19937 random(7);
    std::uniform_real_distribution<double> number(-1.0, 1.0);
    const std::pair<int, int> sizes[] = {{480, 480}, {640, 200}, {200, 640}};
    const Margins margins{0.05, 0.1, 0.2};
    for (const double scale : {1e-6, 1.0, 1e9})
        for (const auto& [width, height] : sizes) {
            const View view = viewFrom(std::to_string(static_cast<int>(180 * number(random))) + "," +
                                           std::to_string(static_cast<int>(90 * number(random))),
                                       "y");
            std::vector<double> first(300);
            std::generate(first.begin(), first.end(), [&] { return scale * (5.0 + number(random)); });
            std::vector<double> second(30);
            std::generate(second.begin(), second.end(), [&] { return scale * (4.0 + number(random)); });
            const Framing framing(view, width, height, margins);
            Framing::Reach reach;
            for (const std::vector<double>& points : {first, second})
                for (std::size_t at = 0; at < points.size(); at += 3)
                    reach.include(framing.reachOf({points[at], points[at + 1], points[at + 2]}));
            const Camera camera = framing.camera(reach);
            first.insert(first.end(), second.begin(), second.end());
            double fullest = 0.0;
            for (const Vec3& point : camera.toCamera(first)) {
                ASSERT_LT(point.z, -0.01F);
                const double x = point.x / (-point.z * camera.tangentX);
                const double y = point.y / (-point.z * camera.tangentY);
                fullest = std::max({fullest, std::abs(x) / (1 - 2 * margins.sides), y / (1 - 2 * margins.top),
                                    -y / (1 - 2 * margins.bottom)});
            }
            EXPECT_NEAR(fullest, 1.0, 1e-4) << scale << ' ' << width << 'x' << height;
        }
}

TEST(Framing, NothingAndASinglePointHaveACamera) {
    const Framing framing(viewFrom("front", "y"), 100, 100, {});
    expectNear(framing.camera({}).position, {0, 0, 1}, "nothing");
    expectNear(framing.camera(framing.reachOf({1000, 2000, 3000})).position, {1000, 2000, 3001}, "a point");
}

// three triangles: one stands still, one moves in both panels, one differs between them by less than the other moves
TEST(Subject, TheCameraIsOnWhatMovesOrDiffers) {
    const auto panelAt = [](double moved, double apart) {
        MeshFrame mesh;
        mesh.polygons = {10, {3, 3, 3}, {0, 1, 2, 3, 4, 5, 6, 7, 8}};
        mesh.points = {0, 0, 0, 1, 0, 0, 0, 1, 0, 10, moved, 0, 11, moved, 0, 10, moved + 1, 0};
        mesh.points.insert(mesh.points.end(), {20, apart, 0, 21, apart, 0, 20, 1 + apart, 0, 1e3, moved, 0});
        return PanelFrame{mesh};
    };
    struct Case {
        const char* text;
        double moved;
        double apart;
        double left, right; // of what the camera is on
    };
    const Case cases[] = {{"all", 3, 0.5, 0, 21},        {"moving", 3, 0.5, 10, 11}, {"differing", 3, 0.5, 20, 21},
                          {"moving", 0, 0.5, 0, 21},     {"differing", 3, 0, 0, 21}, {"moving", 1e-9, 0.5, 10, 11},
                          {"differing", 3, 1e-9, 20, 21}};
    for (const Case& c : cases) {
        Subject subject(frameOnFrom(c.text), Framing(viewFrom("front", "y"), 300, 100, {}));
        subject.include({panelAt(0, 0), panelAt(0, c.apart)});
        subject.include({panelAt(c.moved, 0), panelAt(c.moved, 0)});
        const bool isAll = std::string(c.text) == "all";
        EXPECT_EQ(subject.isFound(), isAll || c.right - c.left < 20) << c.text;
        EXPECT_NEAR(subject.camera().position.x, (c.left + c.right) / 2, 1e-9) << c.text << ' ' << c.moved;
    }
    EXPECT_THAT([] { frameOnFrom("most"); }, ThrowsMessage<std::runtime_error>(HasSubstr("\"most\" is nothing")));
}

TEST(PictureName, FramesInNames) {
    const auto name = [](const char* pattern, int frame, bool several) {
        return pictureName(pattern, frame, several).string();
    };
    EXPECT_EQ(name("/a/pic.png", 7, false), "/a/pic.png");
    EXPECT_EQ(name("/a/pic.png", 7, true), "/a/pic.0007.png");
    EXPECT_EQ(name("/a#/pic.png", -7, true), "/a#/pic.-0007.png");
    EXPECT_EQ(name("##.png", 3, true), "03.png");
    EXPECT_THAT([] { checkPictureName("/pic.jpg"); }, ThrowsMessage<std::runtime_error>(HasSubstr("end in .png")));
    EXPECT_NO_THROW(checkPictureName(std::filesystem::temp_directory_path() / "pic.PNG"));
}

} // namespace
