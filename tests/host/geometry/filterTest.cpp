// SPDX-License-Identifier: Apache-2.0
// Geometry filters: what is computed when, what comes out, and what stays when something fails.
#include "host/geometry/FilterTest.h"

#include "openquarn/HDGModifier.h"
#include "openquarn/HFnMesh.h"

#include <stdexcept>

namespace {

using namespace testNodes;
using testDeformers::grid;
using testDeformers::Hooks;
using testDeformers::meshNode;
using testDeformers::withTag;
using ::testing::ElementsAre;
using ::testing::HasSubstr;
using ::testing::IsEmpty;
using ::testing::SizeIs;

TEST_F(FilterTest, EnvelopeScalesAndReachesEveryGeometry) {
    create("testDeformer", "d");
    const HObject mesh = grid(2, 2);
    for (const unsigned index : {0U, 7U})
        set(input("d", index), mesh);
    for (const double envelope : {1.0, 0.5, 0.0, -2.0, 3.0}) {
        EXPECT_EQ(text(plug("d.envelope").setDouble(envelope)), "");
        for (const unsigned index : {0U, 7U})
            EXPECT_THAT(pushed(output("d", index), mesh), ElementsAre(envelope, envelope, envelope, envelope));
    }
}

TEST_F(FilterTest, OutputsComeIntoBeingWithTheirGeometry) {
    create("testDeformer", "d");
    meshNode("m", grid(2, 2));
    plug("d.input[1].componentTagExpression").setString("*");
    plug("d.weightList[2].weights[0]").setDouble(1.0);
    set("d.originalGeometry[3]", grid(2, 2));
    EXPECT_THAT(outputs("d"), IsEmpty());
    set(input("d", 9), grid(2, 2));
    connect("m.outMesh", input("d", 4));
    EXPECT_THAT(outputs("d"), ElementsAre(4U, 9U));
    create("testDeformer", "e");
    connect("d.outputGeom[12]", input("e", 0));
    EXPECT_THAT(outputs("d"), ElementsAre(4U, 9U, 12U)) << "and when one is connected from";
    EXPECT_EQ(evaluate("e.outputGeom[0]"), "");
    EXPECT_TRUE(plug("e.outputGeom[0]").asHObject().isNull()) << "no geometry in, none out";
}

TEST_F(FilterTest, OneGeometryLeavesTheOthersAlone) {
    const HObject d = create("testDeformer", "d");
    for (const char* name : {"a", "b"})
        create("testDeformer", name);
    for (const unsigned index : {0U, 1U}) {
        set(input(index == 0 ? "a" : "b", 0), grid(3, 3));
        connect(output(index == 0 ? "a" : "b", 0), input("d", index));
    }
    OpenQuarn::ComputeWatch computes;
    EXPECT_EQ(evaluate("d.outputGeom[1]"), "");
    EXPECT_THAT(computes.plugs(), ElementsAre("d.outputGeom[1]", "b.outputGeom[0]"));
    EXPECT_EQ(evaluate("d.outputGeom"), "");
    EXPECT_EQ(OpenQuarn::computeCount(d), 3U) << "the array, and the geometry that was left";
    OpenQuarn::DirtyWatch dirty;
    set(input("a", 0), grid(3, 3, 1.0));
    EXPECT_THAT(dirty.plugs(), ElementsAre("a.outputGeom[0]", "d.input[0].inputGeometry", "d.outputGeom[0]"));
    computes.clear();
    EXPECT_EQ(evaluate("d.outputGeom"), "");
    EXPECT_THAT(computes.plugs(), ElementsAre("d.outputGeom", "d.outputGeom[0]", "a.outputGeom[0]"));
}

TEST_F(FilterTest, UnsetPointsAreSharedAndSetOnesAreNot) {
    create("testDeformer", "d");
    create("testDeformer", "e");
    HFnMesh textured(withTag(grid(3, 3), "some", {8, 1}));
    EXPECT_EQ(text(textured.setUVs({0.5F}, {0.25F}, HIntArray(16))), "");
    const HObject mesh = textured.object();
    set(input("d", 0), mesh);
    connect(output("d", 0), input("e", 0));
    auto push = testDeformers::pushPoints;
    Hooks::deform = [&](HPxDeformerNode& node, HDataBlock& block, HItGeometry& iterator, unsigned index) {
        return node.name() == HString("e") ? push(node, block, iterator, index) : HStatus();
    };
    plug("e.input[0].componentTagExpression").setString("some");
    EXPECT_THAT(pushed(output("e", 0), mesh), ElementsAre(0, 1, 0, 0, 0, 0, 0, 0, 1));
    EXPECT_EQ(plug(output("d", 0)).asHObject(), mesh) << "nothing was set: the same mesh goes on";
    const HObject result = plug(output("e", 0)).asHObject();
    HUintArray tag;
    EXPECT_EQ(text(HFnGeometryData(result).getComponentTag("some", tag)), "");
    HFloatArray us, vs;
    HIntArray corners;
    EXPECT_EQ(text(HFnMesh(result).getUVs(us, vs, corners)), "");
    EXPECT_EQ(corners.length(), 16U);

    // what was handed out stays as it was, also when its buffer would come in handy
    for (int frame = 2; frame < 10; ++frame) {
        push = frame % 4 < 2 ? testDeformers::pushPoints : testDeformers::pushRawPoints;
        set(input("d", 0), withTag(grid(3, 3, frame), "some", {8, 1}));
        plug("e.push").setDouble(frame);
        EXPECT_THAT(pushed(output("e", 0), plug(input("d", 0)).asHObject()),
                    ElementsAre(0, frame, 0, 0, 0, 0, 0, 0, frame));
    }
    push = testDeformers::pushRawPoints;
    plug("e.input[0].componentTagExpression").setString("*");
    EXPECT_THAT(pushed(output("e", 0), plug(input("d", 0)).asHObject()), ::testing::Each(9.0));
    HPointArray kept;
    EXPECT_EQ(text(HFnMesh(result).getPoints(kept)), "");
    EXPECT_EQ(kept[8], HPoint(3, 2, 0));
}

TEST_F(FilterTest, IteratorAndMapperFollowTheComponentTag) {
    create("testDeformer", "d");
    HObject mesh = withTag(grid(3, 2), "some", {4, 0, 5});
    mesh = withTag(withTag(mesh, "all", {0, 1, 2, 3, 4, 5}), "none", {});
    set(input("d", 2), mesh);
    std::vector<unsigned> visited;
    Hooks::deform = [&](HPxDeformerNode&, HDataBlock&, HItGeometry& iterator, unsigned) -> HStatus {
        HPointArray before, after;
        visited.clear();
        iterator.allPositions(before);
        for (; !iterator.isDone(); iterator.next()) {
            visited.push_back(iterator.index());
            EXPECT_EQ(iterator.position(), before[visited.size() - 1]);
            EXPECT_EQ(text(iterator.setPosition(HPoint(100 + iterator.index(), 0, 0))), "");
        }
        EXPECT_EQ(text(iterator.allPositions(after)), "");
        for (std::size_t i = 0; i < visited.size(); ++i)
            EXPECT_EQ(after[i], HPoint(100.0 + visited[i], 0, 0));
        return HStatus::kSuccess;
    };
    struct Row {
        const char* expression;
        std::vector<unsigned> affected;
        bool identity;
    };
    const std::vector<unsigned> all = {0, 1, 2, 3, 4, 5};
    for (const Row& row : {Row{"some", {4, 0, 5}, false}, Row{"*", all, true}, Row{"all", all, true},
                           Row{"none", {}, false}, Row{"", all, true}}) {
        SCOPED_TRACE(row.expression);
        plug("d.input[2].componentTagExpression").setString(row.expression);
        HStatus status;
        const HIndexMapper mapper = deformer("d").indexMapper(2, &status);
        EXPECT_EQ(text(status), "") << "outside of an evaluation, before the first";
        EXPECT_EQ(mapper.isIdentityMap(), row.identity);
        EXPECT_EQ(mapper.fullCount(), 6U);
        EXPECT_EQ(mapper.affectCount(), row.affected.size());
        if (!row.identity) {
            EXPECT_EQ(std::vector<unsigned>(mapper.affectMap().begin(), mapper.affectMap().end()), row.affected);
        }
        const std::vector<HPoint> points = testDeformers::points(plug(output("d", 2)));
        EXPECT_EQ(visited, row.affected);
        for (const unsigned vertex : row.affected)
            EXPECT_EQ(points[vertex], HPoint(100.0 + vertex, 0, 0));
    }
}

TEST_F(FilterTest, FailuresKeepTheFrame) {
    create("testDeformer", "d");
    const HObject mesh = withTag(grid(2, 2), "some", {1});
    set(input("d", 5), mesh);
    const auto fail = [] { return HStatus(HStatus::kFailure, "no luck"); };
    struct Row {
        const char* what;
        std::function<void()> arrange;
        std::vector<const char*> messages; // parts of each
    };
    const std::vector<Row> rows = {
        {"hook fails",
         [&] { Hooks::initialize = [=](HPxDeformerNode&, HDataBlock&, unsigned, bool) { return fail(); }; },
         {"no luck"}},
        {"deform fails after it has set points",
         [&] {
             Hooks::deform = [=](HPxDeformerNode& node, HDataBlock& block, HItGeometry& iterator, unsigned index) {
                 testDeformers::pushPoints(node, block, iterator, index);
                 return fail();
             };
         },
         {"no luck"}},
        {"deform fails after it has written points",
         [&] {
             Hooks::deform = [=](HPxDeformerNode& node, HDataBlock& block, HItGeometry& iterator, unsigned index) {
                 testDeformers::pushRawPoints(node, block, iterator, index);
                 return fail();
             };
         },
         {"no luck"}},
        {"deform throws",
         [&] {
             Hooks::deform = [](HPxDeformerNode&, HDataBlock&, HItGeometry&, unsigned) -> HStatus {
                 throw std::runtime_error("out of rope");
             };
         },
         {"error: d: deform: out of rope", "out of rope"}},
        {"unknown tag",
         [&] { plug("d.input[5].componentTagExpression").setString("soem"); },
         {"'d.input[5].componentTagExpression': geometry 5 has no component tag 'soem'"}},
    };
    for (const Row& row : rows) {
        SCOPED_TRACE(row.what);
        Hooks::reset();
        plug("d.input[5].componentTagExpression").setString("some");
        OpenQuarn::makeDirty(plug(output("d", 5)));
        EXPECT_THAT(pushed(output("d", 5), mesh), ElementsAre(0, 1, 0, 0)) << "it recovers";

        row.arrange();
        set("d.originalGeometry[5]", grid(3, 3, static_cast<double>(&row - rows.data()))); // so that the hook is called
        EXPECT_THAT(evaluate(output("d", 5)), HasSubstr(row.messages.back()));
        EXPECT_EQ(plug(output("d", 5)).asHObject(), mesh);
        const std::vector<std::string> messages = takeMessages();
        ASSERT_EQ(messages.size(), row.messages.size());
        for (std::size_t i = 0; i < messages.size(); ++i)
            EXPECT_THAT(messages[i], HasSubstr(row.messages[i]));
        EXPECT_THAT(evaluate("d.outputGeom"), HasSubstr("the last compute of 'd.outputGeom[5]' failed"));
        EXPECT_TRUE(plug(output("d", 5)).asHObject() == mesh);
        EXPECT_THAT(evaluate(output("d", 5)), HasSubstr("failed")) << "also after the whole array was evaluated";
        takeMessages();
    }
}

TEST_F(FilterTest, ARemovedInputStartsAnew) {
    create("testDeformer", "d");
    set(input("d", 0), grid(2, 2));
    int calls = 0;
    Hooks::initialize = [&](HPxDeformerNode&, HDataBlock&, unsigned, bool) -> HStatus {
        ++calls;
        return HStatus::kSuccess;
    };
    EXPECT_EQ(evaluate("d.outputGeom"), "");
    HDGModifier modifier;
    modifier.removeMultiInstance(plug("d.input[0]"), true);
    EXPECT_EQ(text(modifier.doIt()), "");
    EXPECT_TRUE(plug(output("d", 0)).asHObject().isNull());
    EXPECT_EQ(deformer("d").indexMapper(0).fullCount(), 0U);
    set(input("d", 0), grid(2, 2));
    EXPECT_THAT(testDeformers::points(plug(output("d", 0))), SizeIs(4));
    EXPECT_EQ(calls, 2);
}

} // namespace
