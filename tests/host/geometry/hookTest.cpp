// SPDX-License-Identifier: Apache-2.0
// When the per-geometry hook is called, and the weights of a deformer.
#include "host/geometry/FilterTest.h"

#include "openquarn/HDGModifier.h"
#include "openquarn/HFnMesh.h"

namespace {

using namespace testNodes;
using testDeformers::grid;
using testDeformers::Hooks;
using testDeformers::meshNode;
using testDeformers::withTag;
using ::testing::ElementsAre;

class HookTest : public FilterTest {
protected:
    HookTest() {
        Hooks::initialize = [this](HPxDeformerNode& node, HDataBlock&, unsigned index, bool reset) -> HStatus {
            EXPECT_TRUE(reset);
            if (node.name() != HString("d"))
                return HStatus::kSuccess;
            calls.push_back(index);
            return failing ? HStatus(HStatus::kFailure, "not ready") : HStatus();
        };
    }

    /// Evaluates, and says how often the hook was called for geometry 0; there may be no call for another.
    std::size_t callsIn(const std::function<void()>& change) {
        calls.clear();
        change();
        OpenQuarn::evaluate(plug("d.outputGeom"));
        EXPECT_EQ(std::count(calls.begin(), calls.end(), 0U), static_cast<std::ptrdiff_t>(calls.size()));
        return calls.size();
    }

    /// Data of its own at each call.
    static HObject movedGrid(unsigned columns, double depth) { return tagged(grid(columns, 3, depth)); }
    static HObject tagged(const HObject& mesh) { return withTag(withTag(mesh, "some", {2, 1}), "same", {2, 1}); }

    std::vector<unsigned> calls;
    bool failing = false;
};

TEST_F(HookTest, IsCalledWhenItsSourcesChangeAndNotOtherwise) {
    create("testDeformer", "d");
    create("testDeformer", "up");
    meshNode("m", movedGrid(3, 0.0));
    meshNode("n", movedGrid(3, 0.0));
    set(input("up", 0), movedGrid(3, 0.0));
    set(input("d", 1), movedGrid(5, 0.0));
    EXPECT_EQ(evaluate("d.outputGeom[1]"), "");
    const auto expression = [](const char* text) {
        return [text] { plug("d.input[0].componentTagExpression").setString(text); };
    };
    const auto setTo = [](const std::string& plug, const HObject& mesh) { return [=] { set(plug, mesh); }; };
    struct Step {
        const char* what;
        std::function<void()> change;
        std::size_t calls;
    };
    const std::string rest = "d.originalGeometry[0]";
    const std::vector<Step> steps = {
        {"first evaluation", setTo(input("d", 0), movedGrid(3, 0.0)), 1},
        {"nothing", [] {}, 0},
        {"evaluated again", [] { OpenQuarn::makeDirty(plug("d.outputGeom[0]")); }, 0},
        {"envelope", [] { plug("d.envelope").setDouble(0.5); }, 0},
        {"weights", [] { plug("d.weightList[0].weights[1]").setDouble(0.5); }, 0},
        {"points of the input", setTo(input("d", 0), movedGrid(3, 1.0)), 0},
        {"other polygons", setTo(input("d", 0), movedGrid(4, 1.0)), 1},
        {"equal polygons in a mesh of its own", setTo(input("d", 0), movedGrid(4, 2.0)), 0},
        {"a tag", expression("some"), 1},
        {"another tag with the same list", expression("same"), 1},
        {"another list", setTo(input("d", 0), withTag(movedGrid(4, 2.0), "same", {3, 1})), 1},
        {"an equal list in a mesh of its own", setTo(input("d", 0), withTag(movedGrid(4, 3.0), "same", {3, 1})), 0},
        {"another list of a tag that is not used",
         setTo(input("d", 0), withTag(withTag(movedGrid(4, 3.0), "same", {3, 1}), "some", {0})), 0},
        {"everything", expression("*"), 1},
        {"a first rest geometry", setTo(rest, movedGrid(4, 0.0)), 1},
        {"moved points of it", setTo(rest, movedGrid(4, 0.5)), 1},
        {"equal points in a mesh of its own", setTo(rest, movedGrid(4, 0.5)), 0},
        {"other polygons of it", setTo(rest, movedGrid(2, 0.5)), 1},
        {"no rest geometry", setTo(rest, HObject()), 1},
        {"a connection to it", [&] { connect("m.outMesh", rest); }, 1},
        {"points further up", [] { set("n.inMesh", movedGrid(3, 5.0)); }, 0},
        {"another connection with the same mesh",
         [&] {
             set("n.inMesh", plug("m.inMesh").asHObject());
             disconnect("m.outMesh", rest);
             connect("n.outMesh", rest);
         },
         1},
        {"moved points behind the connection", [] { set("n.inMesh", movedGrid(3, 6.0)); }, 1},
        {"its connection broken", [&] { disconnect("n.outMesh", rest); }, 1},
        {"a connection to the input", [&] { connect("up.outputGeom[0]", input("d", 0)); }, 1},
        {"moved points behind it", [] { plug("up.push").setDouble(2.0); }, 0},
    };
    for (const Step& step : steps)
        EXPECT_EQ(callsIn(step.change), step.calls) << step.what;

    const auto push = [](double distance) { return [=] { plug("d.push").setDouble(distance); }; };
    failing = true;
    EXPECT_EQ(callsIn(expression("some")), 1U);
    EXPECT_EQ(callsIn(push(3.0)), 1U) << "it failed";
    EXPECT_EQ(takeMessages().size(), 4U);
    failing = false;
    EXPECT_EQ(callsIn(push(4.0)), 1U);
    EXPECT_EQ(callsIn(push(5.0)), 0U);
}

TEST_F(HookTest, OtherContextsHaveCallsOfTheirOwn) {
    create("testDeformer", "d");
    set(input("d", 0), movedGrid(3, 0.0));
    EXPECT_EQ(callsIn([] {}), 1U);
    calls.clear();
    {
        OpenQuarn::EvaluationContext context(10.0);
        HStatus status;
        EXPECT_EQ(context.evaluateAt(plug("d.outputGeom[0]"), &status).type(), 14);
        EXPECT_EQ(text(status), "");
        EXPECT_THAT(calls, ElementsAre(0U));
        context.setTime(11.0);
        context.evaluateAt(plug("d.outputGeom[0]"));
        EXPECT_THAT(calls, ElementsAre(0U));
    }
    EXPECT_EQ(callsIn([] { OpenQuarn::makeDirty(plug("d.outputGeom[0]")); }), 0U);
}

TEST_F(HookTest, WeightsFollowTheAffectedVertices) {
    create("testDeformer", "d");
    create("testSum", "animated");
    const HObject mesh = withTag(movedGrid(2, 0.0), "three", {5, 0, 3});
    set(input("d", 0), mesh);
    bool none = true;
    Hooks::deform = [&](HPxDeformerNode& node, HDataBlock& block, HItGeometry& iterator, unsigned index) {
        none = !node.envelopeWeights(block, index);
        return testDeformers::pushPoints(node, block, iterator, index);
    };
    EXPECT_THAT(pushed("d.outputGeom[0]", mesh), ElementsAre(1, 1, 1, 1, 1, 1));
    EXPECT_TRUE(none);
    const HPlug weights = plug("d.weightList[0].weights");
    weights.elementByLogicalIndex(3).setDouble(0.25);
    weights.elementByLogicalIndex(5).setDouble(2.0);
    weights.elementByLogicalIndex(4000000000U).setDouble(9.0);
    EXPECT_THAT(pushed("d.outputGeom[0]", mesh), ElementsAre(1, 1, 1, 0.25, 1, 2));
    EXPECT_FALSE(none);
    plug("d.input[0].componentTagExpression").setString("three");
    EXPECT_THAT(pushed("d.outputGeom[0]", mesh), ElementsAre(1, 0, 0, 0.25, 0, 2));
    weights.elementByLogicalIndex(0).setDouble(-1.0);
    EXPECT_THAT(pushed("d.outputGeom[0]", mesh), ElementsAre(-1, 0, 0, 0.25, 0, 2));
    connect("animated.total", "d.weightList[0].weights[3]");
    plug("animated.values[0]").setDouble(0.75);
    EXPECT_THAT(pushed("d.outputGeom[0]", mesh), ElementsAre(-1, 0, 0, 0.75, 0, 2));
    plug("animated.values[0]").setDouble(0.5);
    EXPECT_THAT(pushed("d.outputGeom[0]", mesh), ElementsAre(-1, 0, 0, 0.5, 0, 2));
    HDGModifier modifier;
    modifier.removeMultiInstance(plug("d.weightList[0]"), true);
    EXPECT_EQ(text(modifier.doIt()), "");
    EXPECT_THAT(pushed("d.outputGeom[0]", mesh), ElementsAre(1, 0, 0, 1, 0, 1));
    EXPECT_TRUE(none);
    plug("d.weightList[1].weights[0]").setDouble(0.0);
    EXPECT_THAT(pushed("d.outputGeom[0]", mesh), ElementsAre(1, 0, 0, 1, 0, 1)) << "those of another geometry";

    HStatus status;
    HDataBlock wrong;
    EXPECT_EQ(deformer("d").envelopeWeights(wrong, 0, &status), nullptr);
    EXPECT_EQ(status, HStatus::kInvalidParameter);
    EXPECT_TRUE(deformer("d").getNamedBuffer("Sync", 0).isNull());
}

} // namespace
