// SPDX-License-Identifier: Apache-2.0
// What becomes dirty, in which order, and what is computed how often.
#include "host/support/SceneTest.h"

#include "openquarn/HDGModifier.h"
#include "openquarn/HFnAttribute.h"
#include "openquarn/HFnDependencyNode.h"
#include "openquarn_app/Evaluation.h"

#include <array>
#include <random>

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

    plug("c.skip").setBool(true);
    computes.clear();
    EXPECT_EQ(plug("c.total").asDouble(), 0.0);
    EXPECT_THAT(computes.plugs(), ElementsAre("c.total")) << "an input that is not read is not computed";
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
          TreeCase{"n.shallow.leaf", false, false}, TreeCase{"n.shallow.own", false, true}}) {
        SCOPED_TRACE(row.set);
        plug("n.flat[0]").asDouble();
        plug("n.shallowOut").asDouble();
        dirty.clear();
        plug(row.set).setDouble(2.0);
        EXPECT_EQ(std::count(dirty.plugs().begin(), dirty.plugs().end(), "n.flat") > 0, row.flat);
        EXPECT_EQ(std::count(dirty.plugs().begin(), dirty.plugs().end(), "n.shallowOut") > 0, row.shallowOut);
    }
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

double sumOfInputs(HPxNode& node, HDataBlock& block) {
    const HFnDependencyNode set(node.thisHObject());
    double sum = block.inputValue(set.attribute("in")).asDouble();
    HArrayDataHandle ins = block.outputArrayValue(set.attribute("ins"));
    for (bool more = ins.elementCount() > 0; more; more = !ins.next().error())
        sum += ins.inputValue().asDouble();
    return sum;
}

/// What is between n0.in and the last node, n, as "source destination".
struct UnreadCase {
    const char* shape;
    std::vector<std::pair<const char*, const char*>> connections;
};

TEST_F(Dirty, AnUnreadInputMayChangeAgain) {
    static bool reads;
    for (const UnreadCase& row :
         {UnreadCase{"an output", {{"n0.out", "n.in"}}},
          UnreadCase{"outputs that are dirty with it", {{"n0.out", "n1.in"}, {"n1.out", "n2.in"}, {"n2.out", "n.in"}}},
          UnreadCase{"an input that is passed on", {{"n0.out", "n1.in"}, {"n1.in", "n2.in"}, {"n2.in", "n.in"}}},
          UnreadCase{"elements", {{"n0.out", "n1.ins[3]"}, {"n1.outs[5]", "n.ins[2]"}}},
          UnreadCase{"whole arrays", {{"n0.out", "n1.ins[3]"}, {"n1.ins", "n2.ins"}, {"n2.ins[3]", "n.in"}}},
          UnreadCase{"what a plug-in adds", {{"n0.out", "n1.in"}}}}) {
        SCOPED_TRACE(row.shape);
        session.newScene();
        for (const char* name : {"n0", "n1", "n2", "n"})
            create("testCase", name);
        const bool isAdded = row.shape == std::string("what a plug-in adds");
        Hooks::dependents = [isAdded](const HPlug& changed, HPlugArray& affected) {
            if (isAdded && changed.name() == "n1.in")
                affected.push_back(plug("n.out"));
            return HStatus();
        };
        Hooks::compute = [isAdded](HPxNode& node, const HPlug& asked, HDataBlock& block) {
            const bool isLast = node.name() == "n";
            const double sum = isLast && !reads    ? -1.0
                               : isLast && isAdded ? plug("n1.in").asDouble()
                                                   : sumOfInputs(node, block);
            return block.outputValue(asked).set(sum);
        };
        for (const auto& [source, destination] : row.connections)
            connect(source, destination);
        reads = false;
        plug("n.out").asDouble();
        double value = 0.0;
        for (const bool reading : {false, false, true, false, false, true}) {
            reads = reading;
            dirty.clear();
            computes.clear();
            plug("n0.in").setDouble(++value);
            EXPECT_EQ(plug("n.out").asDouble(), reads ? value : -1.0);
            EXPECT_EQ(std::count(dirty.plugs().begin(), dirty.plugs().end(), "n.out"), 1);
            EXPECT_EQ(std::count(computes.plugs().begin(), computes.plugs().end(), "n.out"), 1);
        }
    }
}

bool isClean(const HPlug& plug) {
    return HFnDependencyNode(plug.node()).userNode()->forceCache().isClean(plug);
}

// Nodes that are computed from the inputs that they happen to read: whatever was left unread, a change makes everything
// dirty that is clean and connected to it, and tells of nothing else.
TEST_F(Dirty, AChangeReachesAllThatDependsOnIt) {
    constexpr unsigned count = 9;
    std::mt19937 random(7);
    const auto dice = [&random](unsigned sides) { return static_cast<unsigned>(random()) % sides; };
    Hooks::compute = [&](HPxNode& node, const HPlug& asked, HDataBlock& block) {
        HArrayDataHandle ins = block.outputArrayValue(HFnDependencyNode(node.thisHObject()).attribute("ins"));
        for (unsigned i = 0; i < count; ++i)
            if (dice(2) == 0 && !ins.jumpToElement(i).error())
                ins.inputValue();
        return block.outputValue(asked).set(0.0);
    };
    for (int scene = 0; scene < 30; ++scene) {
        session.newScene();
        std::array<std::array<bool, count>, count> depends{}; // [node][on which]
        std::array<HPlug, count> outs;
        for (unsigned node = 0; node < count; ++node) {
            const HFnDependencyNode set(create("testCase", "n" + std::to_string(node)));
            outs[node] = set.findPlug("out");
            depends[node][node] = true;
            for (unsigned other = 0; other < node; ++other) {
                if (dice(3) != 0)
                    continue;
                connect("n" + std::to_string(other) + ".out",
                        "n" + std::to_string(node) + ".ins[" + std::to_string(other) + "]");
                for (unsigned further = 0; further <= other; ++further)
                    depends[node][further] = depends[node][further] || depends[other][further];
            }
        }
        for (int step = 0; step < 100; ++step) {
            for (unsigned reads = dice(4); reads > 0; --reads)
                outs[dice(count)].asDouble();
            const unsigned changed = dice(count);
            std::vector<std::string> news;
            for (unsigned node = 0; node < count; ++node)
                if (depends[node][changed] && isClean(outs[node]))
                    news.emplace_back(outs[node].name().asChar());
            dirty.clear();
            plug("n" + std::to_string(changed) + ".in").setDouble(step);
            std::vector<std::string> told;
            for (const std::string& name : dirty.plugs())
                if (name.substr(2) == ".out")
                    told.push_back(name);
            ASSERT_THAT(told, ::testing::UnorderedElementsAreArray(news)) << "scene " << scene << ", step " << step;
        }
    }
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
