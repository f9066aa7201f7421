// SPDX-License-Identifier: Apache-2.0
// quarn target: caches that fit, caches that do not, and vertices that a scene has joined.
#include "PoseTest.h"

#include "quarn/pose/SceneFrames.h"
#include "quarn/pose/sceneOrder.h"
#include "quarn/scene/meshes.h"
#include "quarn/scene/vertexMap.h"
#include "storage/NpyFile.h"
#include "storage/NpyWriter.h"
#include "storage/npyArray.h"
#include "support/rawCache.h"

#include <algorithm>
#include <cmath>

namespace {

using ::testing::AllOf;
using ::testing::HasSubstr;

constexpr std::size_t vertices = stripScene::vertexCount;

class TargetTest : public PoseTest {
protected:
    /// Every coordinate of a frame is base + frame.
    std::string cache(const std::string& name, std::size_t frames, std::size_t count, float base) const {
        storage::NpyWriter writer(path(name), count);
        for (std::size_t frame = 0; frame < frames; ++frame)
            writer.append(std::vector<float>(3 * count, base + static_cast<float>(frame)));
        writer.finish();
        return path(name);
    }
    static double first(quarn::SceneSession& session, double frame, const std::string& plug) {
        session.host().setTime(frame);
        std::vector<double> xyz;
        quarn::readPoints(quarn::findPlug(plug), xyz);
        EXPECT_EQ(xyz.size(), 3 * vertices);
        return xyz.front();
    }
};

TEST_F(TargetTest, TargetsPlayFromTheFirstExportedFrameAndAreReplaced) {
    stripScene::write(scene(), "setAttr warp.exportStartFrame 5; setAttr warp.exportEndFrame 7");
    std::filesystem::create_directory(path("caches"));
    const std::string one = cache("caches/one.npy", 3, vertices, 10.0F);
    stripScene::quarn({"target", scene(), "--anyway", "--cache", one});
    {
        const auto session = open("scene.json");
        const HObject node = quarn::sourceOf(quarn::findNode("warp"), "targetGeometry[0]").node();
        EXPECT_EQ(quarn::nodeName(node), "strip_target");
        EXPECT_EQ(quarn::sourceOf(quarn::findNode("warp"), "targetMorphGeometry[0]").node(), node);
        EXPECT_EQ(quarn::textOf(quarn::plugOf(node, "cacheFile")), "caches/one.npy"); // the folder can be moved
        EXPECT_EQ(first(*session, 5, "strip_target.outMesh"), 10.0);
        EXPECT_EQ(first(*session, 7, "strip_target.outMesh"), 12.0);
    }
    const std::string two = cache("two.npy", 3, vertices, 20.0F);
    EXPECT_THAT(stripScene::quarn({"target", scene(), "--anyway", "--cache", two, "--geometry", "strip",
                                   "--start-frame", "6", "-o", path("caches/other.json"), "--json"}),
                HasSubstr("\"replaced\": true"));
    // what a scene names by a path from its folder is found from the folder that it is saved in
    stripScene::quarn({"target", scene(), "--anyway", "--cache", one});
    std::filesystem::create_directory(path("elsewhere"));
    stripScene::quarn({"pose", scene(), "-o", path("elsewhere/posed.json"), "--samples", "3", "--start", "5"});
    EXPECT_EQ(first(*open("elsewhere/posed.json"), 6, "strip_target.outMesh"), 11.0);
    stripScene::quarn({"pose", scene(), "-o", path("caches/posed.json"), "--samples", "3", "--start", "5"});
    {
        const auto moved = open("caches/posed.json");
        EXPECT_EQ(quarn::textOf(quarn::findPlug("strip_target.cacheFile")), "one.npy");
    }
    const auto session = open("caches/other.json"); // from where two.npy is outside
    EXPECT_EQ(quarn::nodesOfType("pointCache").size(), 1U);
    EXPECT_EQ(first(*session, 7, "strip_target.outMesh"), 21.0);
}

TEST_F(TargetTest, OtherTargetsAreTakenOffAndStay) {
    stripScene::write(scene(), "connectAttr strip.outMesh warp.targetGeometry[0]");
    stripScene::quarn({"target", scene(), "--anyway", "--cache", cache("one.npy", 1, vertices, 1.0F)});
    const auto session = open("scene.json");
    EXPECT_EQ(first(*session, 1, "strip.outMesh"), 0.0);
    EXPECT_EQ(first(*session, 1, "strip_target.outMesh"), 1.0);
    EXPECT_EQ(quarn::sourceOf(quarn::findNode("warp"), "targetGeometry[0]"), quarn::findPlug("strip_target.outMesh"));
}

TEST_F(TargetTest, CachesThatDoNotFitAreRefusedAndTheSceneStays) {
    stripScene::write(scene());
    const std::string before = bytes(scene());
    const struct {
        std::vector<std::string> arguments;
        std::vector<const char*> says;
    } rows[] = {
        {{"--cache", cache("more.npy", 2, vertices + 1, 0.0F)}, {"more.npy", "19", "18", "--order file"}},
        {{"--cache", cache("none.npy", 0, vertices, 0.0F)}, {"none.npy", "no frames"}},
        {{"--cache", path("missing.npy")}, {"missing.npy"}},
        {{"--cache", cache("ca$HOME.npy", 2, vertices, 0.0F)}, {"ca$HOME.npy", "variable of the environment"}},
        {{"--cache", write("text.npy", "points")}, {"text.npy", "NumPy"}},
        {{"--cache", cache("fits.npy", 2, vertices, 0.0F), "--geometry", "arm"}, {"arm", "0 (strip)"}},
        {{"--cache", path("fits.npy"), "--deformer", "w"}, {"w", "warp"}},
        {{"--cache", path("fits.npy"), "--start-frame", "inf"}, {"--start-frame"}},
        {{"--cache", path("fits.npy"), "--order", "file"}, {"character", "vertexMapFile"}},
    };
    for (const auto& row : rows) {
        std::vector<std::string> arguments{"target", scene(), "--anyway"};
        arguments.insert(arguments.end(), row.arguments.begin(), row.arguments.end());
        const std::string failure = failureOf([&] { stripScene::quarn(arguments); });
        for (const char* part : row.says)
            EXPECT_THAT(failure, HasSubstr(part));
    }
    EXPECT_EQ(bytes(scene()), before);
}

// the file's vertices are the scene's in reverse, and the first of them once more
std::vector<std::int32_t> reversedMap() {
    std::vector<std::int32_t> map;
    for (std::size_t vertex = vertices; vertex-- > 0;)
        map.push_back(static_cast<std::int32_t>(vertex));
    map.push_back(static_cast<std::int32_t>(vertices) - 1);
    return map;
}

TEST_F(TargetTest, CachesInTheFilesOrderAreBroughtIntoTheScenes) {
    std::vector<float> points(3 * (vertices + 1));
    for (std::size_t vertex = 0; vertex < vertices; ++vertex)
        std::fill_n(points.begin() + std::ptrdiff_t(3 * vertex), 3, static_cast<float>(vertex));
    points[3 * vertices] = 0.125F; // joined with vertex 0, at a distance
    points[3 * vertices + 1] = points[3 * vertices + 2] = 0.0F;
    writeRawCache(path("file.npy"), {points});
    const auto apart = [&] {
        quarn::SceneFrames frames(storage::openPointCache(path("file.npy")), {});
        frames.reorder(reversedMap(), vertices);
        quarn::writeSceneFrames(frames, path("scene.npy"), {true, false});
        return frames.largestDistance();
    };
    EXPECT_EQ(apart(), 0.125);
    const storage::NpyFile converted(path("scene.npy"));
    ASSERT_EQ(converted.vertexCount(), vertices);
    std::vector<double> xyz(3 * vertices);
    converted.read(0, 0, xyz);
    for (std::size_t i = 0; i < xyz.size(); ++i) {
        const std::size_t vertex = i / 3;
        EXPECT_EQ(xyz[i], double(vertices - 1 - vertex));
    }

    points[3 * vertices] = std::nanf("");
    writeRawCache(path("file.npy"), {points});
    EXPECT_TRUE(std::isinf(apart()));
}

TEST_F(TargetTest, TheCommandFindsTheMapOfTheCharacter) {
    storage::writeIntegers(path("map.npy"), reversedMap());
    stripScene::write(scene(), "createNode character; setAttr character1.vertexMapFile map.npy;"
                               "setAttr character1.vertexMapDigests 'another " +
                                   quarn::vertexMapDigest(reversedMap()) + "'");
    const std::string file = cache("file.npy", 2, vertices + 1, 3.0F);
    EXPECT_THAT(stripScene::quarn({"target", scene(), "--anyway", "--cache", file, "--order", "file", "--json"}),
                AllOf(HasSubstr("scene.strip_target.npy"), HasSubstr("\"converted\": true")));
    EXPECT_EQ(first(*open("scene.json"), 2, "strip_target.outMesh"), 4.0);

    // of another import, say
    std::vector<std::int32_t> other = reversedMap();
    std::swap(other[0], other[1]);
    storage::writeIntegers(path("map.npy"), other);
    EXPECT_THAT(failureOf([&] {
                    stripScene::quarn({"target", scene(), "--anyway", "--cache", file, "--order", "file"});
                }),
                AllOf(HasSubstr("map.npy"), HasSubstr("another vertex map")));
}

// frames to export and settings of training, while they are the node's defaults
TEST_F(TargetTest, WhatNobodyHasSetFollowsFromTheCache) {
    const struct {
        const char* change;
        std::vector<std::string> flags;
        double first, last, limit;
    } rows[] = {
        {"", {}, 1, 4, 200},
        {"setAttr warp.train[0].principalShapesLimit 30", {"--start-frame", "-2.5"}, -2, 0, 30},
        {"setAttr warp.exportStartFrame 2; setAttr warp.exportEndFrame 1000", {}, 2, 1000, 200},
        {"setAttr warp.exportEndFrame 999", {"--start-frame", "7"}, 1, 999, 200},
    };
    for (const auto& row : rows) {
        SCOPED_TRACE(row.change);
        stripScene::write(scene(), std::string("setAttr warp.exportStartFrame 1; setAttr warp.exportEndFrame 1000;") +
                                       row.change);
        std::vector<std::string> arguments{"target", scene(), "--anyway", "--cache",
                                           cache("one.npy", 4, vertices, 1.0F)};
        arguments.insert(arguments.end(), row.flags.begin(), row.flags.end());
        stripScene::quarn(arguments);
        const auto session = open("scene.json");
        EXPECT_EQ(quarn::numberOf(quarn::findPlug("warp.exportStartFrame")), row.first);
        EXPECT_EQ(quarn::numberOf(quarn::findPlug("warp.exportEndFrame")), row.last);
        EXPECT_EQ(quarn::numberOf(quarn::findPlug("warp.train[0].principalShapesLimit")), row.limit);
    }
}

TEST_F(TargetTest, MapsThatDoNotFitAreRefused) {
    std::vector<std::int32_t> map = reversedMap();
    const auto problem = [&](std::size_t fileVertices) {
        return failureOf([&] { quarn::requireFit(map, fileVertices, vertices); });
    };
    EXPECT_EQ(problem(19), "");
    EXPECT_THAT(problem(20), AllOf(HasSubstr("20"), HasSubstr("19")));
    map[3] = 18;
    EXPECT_THAT(problem(19), AllOf(HasSubstr("vertex 3 of"), HasSubstr("vertex 18")));
    map[3] = -1;
    EXPECT_THAT(problem(19), AllOf(HasSubstr("vertex 3 of"), HasSubstr("vertex -1")));
    map[3] = 0;
    EXPECT_THAT(problem(19), HasSubstr("no vertex of the file for vertex 14"));
}

} // namespace
