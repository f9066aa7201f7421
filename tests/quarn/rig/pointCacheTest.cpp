// SPDX-License-Identifier: Apache-2.0
// The point cache node: which points it gives at which time, and what it does with a file that does not fit.
#include "host/support/testDeformers.h"
#include "quarn/rig/RigTest.h"
#include "support/TemporaryFolder.h"

#include "storage/NpyWriter.h"

#include "openquarn/HFnMesh.h"

#include <fstream>
#include <limits>

namespace {

using namespace testNodes;
using ::testing::AllOf;
using ::testing::ElementsAre;
using ::testing::HasSubstr;
using ::testing::IsEmpty;

/// A grid of four vertices, "base.outMesh", whose points come from "cache".
class PointCache : public RigTest {
public:
    PointCache() {
        testDeformers::meshNode("base", testDeformers::withTag(testDeformers::grid(2, 2), "tip", {3, 1}));
        create("pointCache", "cache");
        connect("base.outMesh", "cache.inMesh");
    }

    std::string path(const std::string& name = "cache.npy") const { return folder_.path() / name; }

    /// A file where vertex v of frame f is at (xs[f], v, -f), in use by the node.
    void play(const std::vector<float>& xs, unsigned vertices = 4) const {
        storage::NpyWriter writer(path(), vertices);
        for (std::size_t frame = 0; frame < xs.size(); ++frame) {
            std::vector<float> xyz;
            for (unsigned vertex = 0; vertex < vertices; ++vertex)
                xyz.insert(xyz.end(), {xs[frame], static_cast<float>(vertex), -static_cast<float>(frame)});
            writer.append(xyz);
        }
        writer.finish();
        EXPECT_EQ(text(plug("cache.cacheFile").setString(path())), "");
    }

    static std::vector<HPoint> points() { return testDeformers::points(plug("cache.outMesh")); }
    static HPoint pointAt(double time) {
        EXPECT_EQ(text(plug("cache.time").setDouble(time)), "");
        return points().at(2);
    }

    /// Expects a failing compute, inMesh in outMesh all the same, and gives the failure's text.
    std::string failure() {
        EXPECT_EQ(text(OpenQuarn::makeDirty(plug("cache.outMesh"))), "");
        const HStatus status = OpenQuarn::evaluate(plug("cache.outMesh"));
        EXPECT_TRUE(status.error());
        EXPECT_EQ(takeMessages().size(), 1U);
        EXPECT_EQ(points(), testDeformers::points(plug("base.outMesh")));
        takeMessages(); // reading it may show the failure again
        return text(status);
    }

private:
    TemporaryFolder folder_;
};

TEST_F(PointCache, GivesTheFrameOfTheTime) {
    play({1, 2, 4});
    struct Row {
        double time;
        HPoint interpolated;
        HPoint lower;
    };
    constexpr double farAway = std::numeric_limits<double>::infinity();
    const std::vector<Row> rows = {
        {10, {1, 2, 0}, {1, 2, 0}},           {11, {2, 2, -1}, {2, 2, -1}},         {12, {4, 2, -2}, {4, 2, -2}},
        {10.5, {1.5, 2, -0.5}, {1, 2, 0}},    {11.25, {2.5, 2, -1.25}, {2, 2, -1}}, {12.5, {4, 2, -2}, {4, 2, -2}},
        {9.5, {1, 2, 0}, {1, 2, 0}},          {-farAway, {1, 2, 0}, {1, 2, 0}},     {farAway, {4, 2, -2}, {4, 2, -2}},
        {12 - 1e-12, {4, 2, -2}, {4, 2, -2}},
    };
    plug("cache.startFrame").setDouble(10);
    for (const Row& row : rows) {
        SCOPED_TRACE(row.time);
        plug("cache.interpolate").setBool(true);
        EXPECT_EQ(pointAt(row.time), row.interpolated);
        plug("cache.interpolate").setBool(false);
        EXPECT_EQ(pointAt(row.time), row.lower);
    }
}

TEST_F(PointCache, FollowsTheSceneAndKeepsPolygonsAndTags) {
    play({1, 2, 4});
    connect("time1.outTime", "cache.time");
    session.setTime(3);
    EXPECT_EQ(points().front(), HPoint(4, 0, -2)) << "the first frame is 1";
    const HObject mesh = plug("cache.outMesh").asHObject();
    EXPECT_EQ(HFnMesh(mesh).numPolygons(), 1);
    HUintArray vertices;
    EXPECT_EQ(text(HFnGeometryData(mesh).getComponentTag("tip", vertices)), "");
    EXPECT_THAT(std::vector<unsigned>(vertices.begin(), vertices.end()), ElementsAre(3, 1));
    session.setTime(1);
    EXPECT_EQ(points().front(), HPoint(1, 0, 0));
}

TEST_F(PointCache, PlaysEveryFormat) {
    for (const char* name : {"cache.npz", "cache.pc2", "cache.mdd"}) {
        const auto writer = storage::createPointCache(path(name), 4, {.frameCount = 2});
        writer->append(std::vector<float>(12, 3.0F));
        writer->append(std::vector<float>(12, 4.0F));
        writer->finish();
        plug("cache.cacheFile").setString(path(name));
        EXPECT_EQ(pointAt(1.5), HPoint(3.5, 3.5, 3.5)) << name;
    }
}

TEST_F(PointCache, ReadsInPiecesWhatIsLarge) {
    constexpr unsigned columns = 3, rows = 1001;
    plug("base.inMesh").setHObject(testDeformers::grid(columns, rows));
    play({0, 1}, columns * rows);
    plug("cache.time").setDouble(1.5);
    const std::vector<HPoint> got = points();
    ASSERT_EQ(got.size(), columns * rows);
    for (unsigned vertex = 0; vertex < got.size(); ++vertex)
        ASSERT_EQ(got[vertex], HPoint(0.5, vertex, -0.5));
}

TEST_F(PointCache, NoticesThatTheFileHasChanged) {
    play({1, 2});
    EXPECT_EQ(pointAt(1).x, 1);
    play({7, 8}); // another file of that name
    EXPECT_EQ(pointAt(2).x, 8);
    std::filesystem::rename(path(), path("moved.npy"));
    EXPECT_THAT(failure(), HasSubstr("No such file"));
    plug("cache.cacheFile").setString(path("moved.npy"));
    EXPECT_EQ(pointAt(1).x, 7);
    plug("cache.cacheFile").setString("");
    EXPECT_EQ(points(), testDeformers::points(plug("base.outMesh"))) << "without a file it does nothing";
    EXPECT_THAT(takeMessages(), IsEmpty());
}

TEST_F(PointCache, PassesTheMeshThroughWhenTheFileDoesNotFit) {
    play({1}, 5);
    EXPECT_THAT(failure(),
                AllOf(HasSubstr("cache: "), HasSubstr("'" + path() + "' has 5 vertices"), HasSubstr("inMesh has 4")));
    play({});
    EXPECT_THAT(failure(), HasSubstr("'" + path() + "' has no frames"));
    play({1});
    plug("cache.time").setDouble(std::numeric_limits<double>::quiet_NaN());
    EXPECT_THAT(failure(), HasSubstr("no number"));
    plug("cache.time").setDouble(1);
    std::ofstream(path()) << "no cache";
    EXPECT_THAT(failure(), AllOf(HasSubstr("cache: "), HasSubstr(path()), HasSubstr("no NumPy file")));
    play({3});
    EXPECT_EQ(pointAt(1).x, 3) << "mended";
    disconnect("base.outMesh", "cache.inMesh");
    plug("cache.inMesh").setHObject(HObject::kNullObj);
    EXPECT_TRUE(OpenQuarn::evaluate(plug("cache.outMesh")).error());
    EXPECT_THAT(takeMessages(), ElementsAre(HasSubstr("inMesh holds no mesh")));
}

} // namespace
