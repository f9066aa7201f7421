// SPDX-License-Identifier: Apache-2.0
// quarn target with caches of other tools: another format, another space, another order, times of their own.
#include "PoseTest.h"

#include "quarn/fit/NearestPoint.h"
#include "quarn/fit/restOrder.h"
#include "quarn/pose/cacheTimes.h"
#include "quarn/scene/meshes.h"
#include "storage/PointCacheWriter.h"
#include "storage/mddHead.h"

#include <algorithm>
#include <cmath>
#include <random>

namespace {

using ::testing::AllOf;
using ::testing::ElementsAre;
using ::testing::HasSubstr;
using ::testing::IsEmpty;

constexpr std::size_t vertices = stripScene::vertexCount;
using Frame = std::vector<double>; // x, y, z of every vertex

Frame pointsIn(quarn::SceneSession& session, double frame, const std::string& plug) {
    session.host().setTime(frame);
    Frame xyz;
    quarn::readPoints(quarn::findPlug(plug), xyz);
    return xyz;
}

class ForeignCacheTest : public PoseTest {
protected:
    ForeignCacheTest() {
        stripScene::write(scene());
        rest_ = pointsIn(*open("scene.json"), 1, "strip.outMesh");
    }

    /// The strip at rest, and then moved a little more in every frame.
    Frame sceneFrame(std::size_t frame) const {
        Frame xyz = rest_;
        for (std::size_t i = 0; i < xyz.size(); ++i)
            xyz[i] += static_cast<double>(frame) * 0.015625 * static_cast<double>(i % 3 + 1);
        return xyz;
    }
    std::string cache(const std::string& name, const std::vector<Frame>& frames) const {
        const auto writer = storage::createPointCache(path(name), frames[0].size() / 3, {.frameCount = frames.size()});
        for (const Frame& frame : frames)
            writer->append(std::vector<float>(frame.begin(), frame.end()));
        writer->finish();
        return path(name);
    }
    std::string failure(std::vector<std::string> arguments) const {
        arguments.insert(arguments.begin(), {"target", scene()});
        return failureOf([&] { stripScene::quarn(arguments); });
    }

    Frame rest_;
};

/// As a tool has it whose z is up, whose unit is 0.01 of the scene's, and that counts vertices from the other end.
Frame foreign(const Frame& scene) {
    Frame xyz;
    for (std::size_t vertex = scene.size() / 3; vertex-- > 0;)
        for (const double coordinate : {scene[3 * vertex], -scene[3 * vertex + 2], scene[3 * vertex + 1]})
            xyz.push_back(100.0 * coordinate);
    return xyz;
}

TEST_F(ForeignCacheTest, OfAnyFormatIsBroughtIntoTheScene) {
    for (const char* name : {"cache.npy", "cache.npz", "cache.pc2", "cache.mdd"}) {
        SCOPED_TRACE(name);
        const std::vector<Frame> frames{foreign(sceneFrame(2)), foreign(sceneFrame(0)), foreign(sceneFrame(1))};
        EXPECT_THAT(stripScene::quarn({"target", scene(), "--cache", cache(name, frames), "--axes", "z", "--scale",
                                       "0.01", "--order", "rest", "--start-frame", "5", "--rest-frame", "6", "--json",
                                       "-o", path("posed.json")}),
                    HasSubstr("\"converted\": true"));
        auto session = open();
        const std::pair<double, std::size_t> shown[] = {{5, 2}, {6, 0}, {7, 1}};
        for (const auto& [time, frame] : shown) {
            const Frame got = pointsIn(*session, time, "strip_target.outMesh"), wanted = sceneFrame(frame);
            ASSERT_EQ(got.size(), wanted.size());
            for (std::size_t i = 0; i < got.size(); ++i)
                EXPECT_NEAR(got[i], wanted[i], 1e-6) << time << ", " << i;
        }
        session.reset(); // one at a time
        // what is the scene's already is played as it is, in every format
        const std::string own = cache(std::string("own") + name, {sceneFrame(0), sceneFrame(1)});
        EXPECT_THAT(stripScene::quarn({"target", scene(), "--cache", own, "--order", "rest", "--axes", "y", "--json",
                                       "-o", path("own.json")}),
                    HasSubstr("\"converted\": false"));
        EXPECT_EQ(pointsIn(*open("own.json"), 2, "strip_target.outMesh"), sceneFrame(1));
    }
}

TEST_F(ForeignCacheTest, ThatCannotBeMatchedIsRefused) {
    Frame folded = rest_; // vertex 4 where vertex 7 is
    std::copy_n(rest_.begin() + 3 * 7, 3, folded.begin() + 3 * 4);
    const std::string one = cache("one.pc2", {rest_}), two = cache("two.pc2", {folded});
    const std::string more = cache("more.pc2", {Frame(3 * (vertices + 1))});
    const struct {
        std::vector<std::string> arguments;
        std::vector<const char*> says;
    } rows[] = {
        {{"--cache", two, "--order", "rest"}, {"vertices 4 and 7 of the cache", "vertex 7 of strip"}},
        {{"--cache", more, "--order", "rest"}, {"19", "strip has 18"}},
        {{"--cache", one, "--order", "rest", "--rest-frame", "3"}, {"--rest-frame 3", "frames 1-1"}},
        {{"--cache", one, "--order", "rest", "--rest-frame", "nan"}, {"--rest-frame nan"}},
        {{"--cache", one, "--rest-frame", "1"}, {"--rest-frame goes with --order rest"}},
        {{"--cache", one, "--scale", "0"}, {"--scale", "above 0", "'0'"}},
        {{"--cache", one, "--scale", "inf"}, {"--scale", "'inf'"}},
        {{"--cache", one, "--scale", "1e300"}, {"of its frame 0", "finite"}},
        {{"--cache", one, "--axes", "x"}, {"--axes"}},
    };
    for (const auto& row : rows) {
        const std::string said = failure(row.arguments);
        for (const char* part : row.says)
            EXPECT_THAT(said, HasSubstr(part));
    }
}

TEST(MatchByRest, TakesVerticesInOnePlaceInTheirOrder) {
    const Frame rest{0, 0, 0, 5, 0, 0, 5, 0, 0, 0, 7, 0}, cache{5, 0, 0, 0, 7.25, 0, 5, 0, 0, 0, 0, 0};
    const quarn::RestMatch match = quarn::matchByRest(cache, rest, "strip");
    EXPECT_THAT(match.sceneVertexOf, ElementsAre(1, 3, 2, 0));
    EXPECT_EQ(match.largestDistance, 0.25);
    EXPECT_EQ(match.guessed, std::pair(std::size_t{1}, std::size_t{2}));
}

TEST(NearestPoint, IsWhatLookingAtAllFinds) {
    std::mt19937 random(5);
    for (const std::size_t count : {1U, 2U, 3U, 50U, 400U}) {
        std::uniform_int_distribution<int> place(0, 6); // many in one place, many as near as another
        Frame points(3 * count);
        std::generate(points.begin(), points.end(), [&] { return place(random); });
        const quarn::NearestPoint tree(points);
        for (int round = 0; round < 200; ++round) {
            const Frame point{place(random) + 0.5 * (round % 2), double(place(random)), double(place(random))};
            std::size_t best = 0;
            const auto squared = [&](std::size_t vertex) {
                const double *at = &points[3 * vertex], x = at[0] - point[0], y = at[1] - point[1],
                             z = at[2] - point[2];
                return x * x + y * y + z * z;
            };
            for (std::size_t vertex = 1; vertex < count; ++vertex)
                best = squared(vertex) < squared(best) ? vertex : best;
            ASSERT_EQ(tree.nearest(point), best) << count;
        }
    }
}

// a cache of a rate, of times in seconds, or of PC2's two numbers; played from frame 1 on in a scene of 24 a second
class CacheTimesTest : public ForeignCacheTest {
protected:
    std::vector<std::string> ofSeconds(const std::vector<float>& seconds) const {
        write("times.mdd", storage::makeMddHead(0, seconds));
        return quarn::cacheTimesNotes(*storage::openPointCache(path("times.mdd")), 1.0, 24.0);
    }
    std::vector<std::string> written(const std::string& name, const storage::CacheTiming& timing) const {
        const auto writer = storage::createPointCache(path(name), 0, timing);
        for (std::size_t frame = 0; frame < timing.frameCount; ++frame)
            writer->append({});
        writer->finish();
        return quarn::cacheTimesNotes(*storage::openPointCache(path(name)), 1.0, 24.0);
    }
};

TEST_F(CacheTimesTest, AreComparedWithTheScenes) {
    std::vector<float> late(3000); // rounding of ten minutes at 24 a second is no unevenness
    for (std::size_t i = 0; i < late.size(); ++i)
        late[i] = static_cast<float>((14000.0 + static_cast<double>(i)) / 24.0);
    const float frame = 1.0F / 24.0F;
    EXPECT_THAT(ofSeconds({0, frame, 2 * frame}), IsEmpty()) << "0 is where others begin whatever the frame";
    EXPECT_THAT(ofSeconds({frame}), IsEmpty());
    EXPECT_THAT(ofSeconds(late), ElementsAre(AllOf(HasSubstr("frame 14000"), HasSubstr("from frame 1 on"))));
    EXPECT_THAT(ofSeconds({0, 0.04F, 0.08F}), ElementsAre(AllOf(HasSubstr("25 frames"), HasSubstr("has 24"))));
    EXPECT_THAT(ofSeconds({0, frame, 3 * frame, 3 * frame}),
                ElementsAre(AllOf(HasSubstr("its frame 2 is 0.0833333 s"), HasSubstr("0.0416667"))));
    EXPECT_THAT(ofSeconds({1, 1}), ElementsAre(AllOf(HasSubstr("do not rise"), HasSubstr("frame 1 at 1 s"))));
    for (const char* name : {"own.npy", "own.npz", "own.pc2", "own.mdd"})
        EXPECT_THAT(written(name, {3, 1.0, 1.0, 24.0}), IsEmpty()) << name;
    EXPECT_THAT(written("a.pc2", {3, 1.0, 2.0, 24.0}), ElementsAre(HasSubstr("every 2 frames")));
    EXPECT_THAT(written("b.pc2", {3, 0.0, 1.0, 24.0}),
                ElementsAre(AllOf(HasSubstr("begins at frame 0"), HasSubstr("from frame 1 on"))));
    EXPECT_THAT(written("c.mdd", {3, 1.0, 1.0, 30.0}),
                ElementsAre(AllOf(HasSubstr("30 frames"), HasSubstr("has 24")), HasSubstr("begins at frame 0.8")));
}

} // namespace
