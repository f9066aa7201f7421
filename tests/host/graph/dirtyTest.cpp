// SPDX-License-Identifier: Apache-2.0
// What becomes dirty, in which order, and what is computed how often.
#include "host/support/SceneTest.h"

#include "openquarn/HDGModifier.h"
#include "openquarn/HFnAttribute.h"
#include "openquarn/HFnDependencyNode.h"
#include "openquarn_app/Evaluation.h"

namespace {

using namespace testNodes;
using ::testing::ElementsAre;
using ::testing::IsEmpty;
using ::testing::UnorderedElementsAre;

class Dirty : public SceneTest {
protected:
    OpenQuarn::DirtyWatch dirty;
    OpenQuarn::ComputeWatch computes;
};

TEST_F(Dirty, GoesAlongAChainOnceAndIsComputedOnceOnDemand) {
    for (const char* name : {"a", "b", "c"})
        create("testSum", name);
    connect("a.total", "b.values[0]");
    connect("b.total", "c.values[3]");
    EXPECT_EQ(plug("c.total").asDouble(), 0.0);
    dirty.clear();
    computes.clear();

    EXPECT_EQ(text(plug("a.values[7]").setDouble(2.5)), "");
    EXPECT_THAT(dirty.plugs(), ElementsAre("a.total", "a.rounded", "b.values[0]", "b.total", "b.rounded", "c.values[3]",
                                           "c.total", "c.rounded"));
    EXPECT_THAT(computes.plugs(), IsEmpty());

    EXPECT_EQ(plug("c.total").asDouble(), 2.5);
    EXPECT_THAT(computes.plugs(), ElementsAre("c.total", "b.total", "a.total"));
    EXPECT_EQ(plug("c.total").asDouble(), 2.5);
    EXPECT_EQ(plug("c.rounded").asInt(), 2) << "2.5 goes to the even neighbour";
    EXPECT_EQ(computes.plugs().size(), 3U) << "nothing was dirty, and compute() sets both outputs";

    dirty.clear();
    plug("a.values[7]").setDouble(3.0);
    plug("a.values[8]").setDouble(1.0);
    EXPECT_EQ(dirty.plugs().size(), 8U) << "what is dirty is not walked again";
}

TEST_F(Dirty, UnreadInputsAreNotComputed) {
    create("testSum", "up");
    create("testSum", "down");
    connect("up.total", "down.values[0]");
    plug("down.skip").setBool(true);
    plug("up.values[0]").setDouble(4.0);
    EXPECT_EQ(plug("down.total").asDouble(), 0.0);
    EXPECT_THAT(computes.plugs(), ElementsAre("down.total"));
    plug("down.skip").setBool(false);
    EXPECT_EQ(plug("down.total").asDouble(), 4.0);
}

struct TreeCase {
    const char* set;
    bool flat, shallowOut;
};

TEST_F(Dirty, TheTreeFlagDecidesWhetherWhatIsBelowCounts) {
    create("testLists", "n");
    plug("n.lists[2].items[1]").setDouble(1.0);
    for (const TreeCase& row :
         {TreeCase{"n.lists[2].items[1]", true, false}, TreeCase{"n.lists[2].items[5]", true, false},
          TreeCase{"n.lists[4].weight", true, false}, TreeCase{"n.note", false, false},
          TreeCase{"n.shallow.leaf", false, false}}) {
        SCOPED_TRACE(row.set);
        plug("n.flat[0]").asDouble();
        plug("n.shallowOut").asDouble();
        dirty.clear();
        plug(row.set).setDouble(2.0);
        EXPECT_EQ(std::count(dirty.plugs().begin(), dirty.plugs().end(), "n.flat") > 0, row.flat);
        EXPECT_EQ(std::count(dirty.plugs().begin(), dirty.plugs().end(), "n.shallowOut") > 0, row.shallowOut);
    }
}

TEST_F(Dirty, PluginsAddDependents) {
    create("testCase", "n");
    create("testSum", "other");
    plug("other.total").asDouble();
    Hooks::dependents = [](const HPlug& changed, HPlugArray& affected) {
        if (changed.partialName() == "in")
            affected.push_back(plug("other.total"));
        return HStatus();
    };
    dirty.clear();
    plug("n.in").setDouble(1.0);
    EXPECT_THAT(dirty.plugs(), ::testing::Contains("other.total"));
}

TEST_F(Dirty, ElementsOfAnOutputAreDirtyOneByOne) {
    create("testCase", "n");
    Hooks::compute = [](HPxNode&, const HPlug& plug, HDataBlock& block) {
        return plug.isElement() ? block.outputValue(plug).set(1.0 + plug.logicalIndex())
                                : HStatus(HStatus::kUnknownParameter);
    };
    EXPECT_EQ(plug("n.outs[0]").asDouble(), 1.0);
    EXPECT_EQ(plug("n.outs[1]").asDouble(), 2.0);
    plug("n.in").setDouble(5.0);
    EXPECT_EQ(plug("n.outs[0]").asDouble(), 1.0);
    dirty.clear();
    computes.clear();
    plug("n.in").setDouble(6.0); // one element was clean, so the array was not dirty as a whole
    EXPECT_THAT(dirty.plugs(), ElementsAre("n.outs"));
    plug("n.outs[0]").asDouble();
    plug("n.outs[1]").asDouble();
    EXPECT_THAT(computes.plugs(), ElementsAre("n.outs[0]", "n.outs[1]"));
}

TEST_F(Dirty, ForcedDirtReachesWhatIsDirtyAlready) {
    create("testSum", "a");
    create("testSum", "b");
    connect("a.total", "b.values[0]");
    dirty.clear();
    EXPECT_EQ(text(OpenQuarn::makeDirty(plug("a.total").node())), "");
    EXPECT_THAT(dirty.plugs(), UnorderedElementsAre("a.total", "a.rounded", "b.values[0]", "b.total", "b.rounded"));
    EXPECT_EQ(text(OpenQuarn::makeDirty(plug("a.nothing"))), "the plug is null");
}

TEST_F(Dirty, AFailingComputeIsReportedOnceAndKeepsTheLastValue) {
    create("testCase", "n");
    create("testSum", "down");
    connect("n.out", "down.values[0]");
    plug("n.in").setDouble(3.0);
    EXPECT_EQ(plug("down.total").asDouble(), 3.0);

    Hooks::compute = [](HPxNode&, const HPlug&, HDataBlock&) { return HStatus(HStatus::kFailure, "no such luck"); };
    plug("n.in").setDouble(4.0);
    HStatus status;
    EXPECT_EQ(plug("down.total").asDouble(&status), 3.0);
    EXPECT_EQ(text(status), "") << "a failure further up is not the reader's";
    EXPECT_THAT(takeMessages(), ElementsAre("report: 'n.out' could not be computed: no such luck"));
    EXPECT_EQ(plug("n.out").asDouble(&status), 3.0);
    EXPECT_EQ(text(status), "the last compute of 'n.out' failed");

    Hooks::compute = [](HPxNode&, const HPlug&, HDataBlock&) -> HStatus { throw std::runtime_error("bang"); };
    plug("n.in").setDouble(5.0);
    EXPECT_EQ(text(OpenQuarn::evaluate(plug("n.out"))), "compute: bang");
    EXPECT_THAT(takeMessages(),
                ElementsAre("error: n: compute: bang", "report: 'n.out' could not be computed: compute: bang"));

    Hooks::reset();
    plug("n.in").setDouble(6.0);
    EXPECT_EQ(plug("down.total").asDouble(&status), 6.0);
    EXPECT_EQ(text(status), "");
}

TEST_F(Dirty, AComputeThatAsksForItselfIsToldSo) {
    create("testCase", "n");
    Hooks::compute = [](HPxNode&, const HPlug& asked, HDataBlock& block) {
        HStatus status;
        plug("n.out").asDouble(&status);
        return status.error() ? status : block.outputValue(asked).set(1.0);
    };
    EXPECT_TRUE(OpenQuarn::evaluate(plug("n.out")).error());
    EXPECT_EQ(takeMessages().front(), "error: 'n.out' depends on itself: its last value is used");
}

TEST_F(Dirty, AChainOfTwentyThousandNodesNeedsNoDeepStack) {
    constexpr int length = 20000;
    std::vector<HPlug> ins, outs;
    for (int i = 0; i < length; ++i) {
        const HFnDependencyNode set(create("testCase"));
        ins.push_back(set.findPlug("in"));
        outs.push_back(set.findPlug("out"));
    }
    HDGModifier modifier;
    for (std::size_t i = 1; i < length; ++i)
        modifier.connect(outs[i - 1], ins[i]);
    EXPECT_EQ(text(modifier.doIt()), "");
    ins.front().setDouble(42.0);
    computes.clear();
    EXPECT_EQ(outs.back().asDouble(), 42.0);
    EXPECT_EQ(computes.plugs().size(), std::size_t{length});
}

} // namespace
