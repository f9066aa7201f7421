// SPDX-License-Identifier: Apache-2.0
// Connections: what is refused, whole arrays, what happens on disconnection and deletion.
#include "host/support/SceneTest.h"

#include "openquarn/HDGModifier.h"
#include "openquarn/HFnDependencyNode.h"
#include "openquarn_app/Evaluation.h"

namespace {

using namespace testNodes;
using ::testing::ElementsAre;
using ::testing::HasSubstr;

class Connection : public SceneTest {
protected:
    static std::string tryToConnect(const std::string& source, const std::string& destination) {
        HDGModifier modifier;
        modifier.connect(plug(source), plug(destination));
        return text(modifier.doIt());
    }
};

struct RefusedCase {
    const char* source;
    const char* destination;
    const char* why;
};

TEST_F(Connection, IsRefusedWithBothNames) {
    for (const char* name : {"a", "b", "c"})
        create("testSum", name);
    create("testLists", "l");
    connect("a.total", "b.values[0]");
    connect("b.total", "c.values[0]");
    plug("b.bare").setLocked(true);
    const std::vector<RefusedCase> rows = {
        {"c.total", "a.values[5]", "the source depends on the destination"},
        {"a.total", "a.values[5]", "the source depends on the destination"},
        {"c.rounded", "a.scale", "the source depends on the destination"},
        {"c.total", "b.values[0]", "the destination is connected from 'a.total'"},
        {"a.total", "c.total", "the destination is not writable, or not connectable"},
        {"a.total", "c.text", "a double does not fit a string"},
        {"a.message", "c.text", "a message does not fit a string"},
        {"a.total", "c.values", "one is a whole array, the other is not"},
        {"l.flat", "c.scale", "one is a whole array, the other is not"},
        {"a.total", "b.bare", "the destination is locked"},
        {"l.shallow", "c.matrix", "a compound does not fit a matrix"},
    };
    for (const RefusedCase& row : rows) {
        const std::string refused = tryToConnect(row.source, row.destination);
        EXPECT_THAT(refused, HasSubstr(row.why));
        EXPECT_THAT(refused, HasSubstr("'" + std::string(row.source) + "' to '" + row.destination + "'"));
    }
    EXPECT_EQ(plug("a.values").numElements(), 0U) << "a refused element does not come into being";
}

TEST_F(Connection, WholeArraysCarryAllElementsBothWays) {
    create("testLists", "up");
    create("testSum", "down");
    connect("up.flat", "down.values");
    for (unsigned i = 0; i < 5; ++i)
        plug("up.lists[0].items[" + std::to_string(i) + "]").setDouble(1 << i);
    EXPECT_EQ(plug("down.total").asDouble(), 31.0);
    EXPECT_EQ(plug("down.values").numElements(), 5U);
    EXPECT_EQ(plug("down.values[3]").source().name(), "up.flat[3]");
    EXPECT_THAT(text(plug("down.values[3]").setDouble(1.0)), HasSubstr("is connected from 'up.flat'"));

    HDGModifier modifier;
    modifier.removeMultiInstance(plug("up.lists[0].items[4]"), false);
    modifier.removeMultiInstance(plug("up.lists[0].items[1]"), false);
    EXPECT_EQ(text(modifier.doIt()), "");
    HStatus status;
    plug("up.flat[4]").asDouble(&status);
    EXPECT_EQ(text(status), "'up.flat[4]' does not exist after its node was evaluated");
    EXPECT_EQ(plug("down.total").asDouble(), 13.0);
    EXPECT_EQ(plug("down.values").numElements(), 3U) << "surplus elements go";

    disconnect("up.flat", "down.values");
    EXPECT_EQ(plug("down.total").asDouble(), 13.0) << "the last values stay";
}

TEST_F(Connection, CompoundsCarryTheirChildren) {
    create("testLists", "up");
    create("testLists", "down");
    connect("up.lists[1]", "down.lists[4]");
    plug("up.lists[1].items[0]").setDouble(3.0);
    plug("up.lists[1].weight").setDouble(0.5);
    EXPECT_EQ(plug("down.flat[0]").asDouble(), 3.0);
    EXPECT_EQ(plug("down.lists[4].weight").asDouble(), 0.5);
}

TEST_F(Connection, BreakingOneDoesAsTheAttributeSays) {
    create("testSum", "up");
    create("testSum", "n");
    plug("up.values[0]").setDouble(5.0);
    const std::vector<std::pair<std::string, double>> rows = {{"n.kept", 5.0}, {"n.reset", 7.0}, {"n.values[2]", 0.0}};
    for (const auto& [name, after] : rows) {
        SCOPED_TRACE(name);
        const std::string down = HFnDependencyNode(create("testSum")).name().asStdString();
        connect("up.total", name);
        connect(name, down + ".values[0]");
        EXPECT_EQ(plug(down + ".total").asDouble(), 5.0);
        disconnect("up.total", name);
        EXPECT_EQ(plug(down + ".total").asDouble(), after) << "what depends on it is told";
        EXPECT_EQ(plug(name).asDouble(), after);
    }
    EXPECT_EQ(plug("n.values").numElements(), 0U);
    EXPECT_EQ(plug("n.total").asDouble(), 0.0);
}

TEST_F(Connection, BothNodesAreTold) {
    create("testCase", "a");
    create("testCase", "b");
    std::vector<std::string> told;
    Hooks::connection = [&](const char* what, const HPlug& own, const HPlug& other, bool asSource) {
        told.push_back(std::string(what) + " " + own.name().asChar() + " " + other.name().asChar() +
                       (asSource ? " source" : ""));
    };
    connect("a.out", "b.ins[1]");
    disconnect("a.out", "b.ins[1]");
    EXPECT_THAT(told, ElementsAre("made a.out b.ins[1] source", "made b.ins[1] a.out", "broken a.out b.ins[1] source",
                                  "broken b.ins[1] a.out"));
}

TEST_F(Connection, ANodeMayCleanUpAfterALostArray) {
    create("testLists", "up");
    create("testCase", "n");
    plug("up.lists[0].items[0]").setDouble(1.0);
    connect("up.flat", "n.ins");
    plug("n.outs[0]").asDouble();
    plug("n.ins[0]").asDouble();
    Hooks::connection = [](const char* what, const HPlug& own, const HPlug&, bool asSource) {
        HDGModifier modifier;
        if (std::string(what) == "broken" && !asSource && own.isArray())
            for (unsigned i = own.numElements(); i > 0; --i)
                modifier.removeMultiInstance(own.elementByPhysicalIndex(i - 1), false);
        EXPECT_EQ(text(modifier.doIt()), "");
    };
    EXPECT_EQ(plug("n.ins").numElements(), 1U);
    disconnect("up.flat", "n.ins");
    EXPECT_EQ(plug("n.ins").numElements(), 0U);
}

TEST_F(Connection, DeletingANodeBreaksItsConnections) {
    create("testSum", "a");
    const HObject middle = create("testSum", "b");
    create("testSum", "c");
    connect("a.total", "b.values[0]");
    connect("b.total", "c.values[0]");
    connect("b.rounded", "c.kept");
    plug("a.values[0]").setDouble(2.0);
    EXPECT_EQ(plug("c.total").asDouble(), 2.0);
    HDGModifier modifier;
    modifier.deleteNode(middle);
    EXPECT_EQ(text(modifier.doIt()), "");
    HPlugArray destinations;
    plug("a.total").destinations(destinations);
    EXPECT_TRUE(destinations.empty());
    EXPECT_EQ(plug("c.values").numElements(), 0U);
    EXPECT_EQ(plug("c.total").asDouble(), 0.0);
    EXPECT_EQ(plug("c.kept").asDouble(), 0.0) << "never asked for, so the value was never carried over";
}

TEST_F(Connection, TheModifierStopsAtTheFirstFailureAndGoesOnFromThere) {
    create("testSum", "a");
    HDGModifier modifier;
    modifier.newPlugValueDouble(plug("a.bare"), 1.0);
    modifier.newPlugValueDouble(plug("a.total"), 1.0);
    modifier.newPlugValueInt(plug("a.int32"), 9);
    EXPECT_EQ(text(modifier.doIt()), "'a.total' is an output and cannot be set");
    EXPECT_EQ(plug("a.bare").asDouble(), 1.0);
    EXPECT_EQ(plug("a.int32").asInt(), 0);
    EXPECT_TRUE(modifier.doIt().error()) << "the failing change is still first";
}

} // namespace
