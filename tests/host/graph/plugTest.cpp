// SPDX-License-Identifier: Apache-2.0
// Plugs: naming, reading, setting, and what is refused.
#include "host/support/SceneTest.h"

#include "openquarn/HDGModifier.h"
#include "openquarn/HDataBlock.h"
#include "openquarn/HFnAttribute.h"
#include "openquarn/HFnDependencyNode.h"
#include "openquarn/HMatrix.h"
#include "openquarn/HNodeClass.h"
#include "openquarn/HNodeMessage.h"
#include "openquarn/HPxNode.h"
#include "openquarn/HSelectionList.h"

#include <cmath>
#include <limits>
#include <map>
#include <random>

namespace {

using namespace testNodes;
using ::testing::ElementsAre;
using ::testing::HasSubstr;

class Plug : public SceneTest {};

struct NumberCase {
    const char* plug;
    double set;
    double expected;
};

TEST_F(Plug, NumbersAreStoredAsTheAttributeStoresThem) {
    create("testSum", "n");
    constexpr double infinity = std::numeric_limits<double>::infinity();
    const std::vector<NumberCase> rows = {
        {"n.skip", 0.25, 1},
        {"n.skip", -0.0, 0},
        {"n.short16", 2.5, 2},
        {"n.short16", 3.5, 4},
        {"n.short16", 40000, 32767},
        {"n.short16", -1e300, -32768},
        {"n.short16", std::nan(""), 0},
        {"n.int32", 1e10, 2147483647},
        {"n.int32", -infinity, -2147483648.0},
        {"n.int32", -7.5, -8},
        {"n.single", 0.1, 0.1F},
        {"n.single", 1e300, infinity},
        {"n.single", -3.4028235677973362e38, -3.4028234663852886e38},
        {"n.scale", 100.5, 100},
        {"n.scale", -infinity, -100},
        {"n.choice", 3, 3},
        {"n.bare", -0.0, -0.0},
    };
    for (const NumberCase& row : rows) {
        SCOPED_TRACE(std::string(row.plug) + " = " + std::to_string(row.set));
        EXPECT_EQ(text(plug(row.plug).setDouble(row.set)), "");
        EXPECT_EQ(plug(row.plug).asDouble(), row.expected);
    }
    plug("n.bare").setDouble(1e10);
    EXPECT_EQ(plug("n.bare").asShort(), 32767);
    EXPECT_EQ(plug("n.bare").asInt(), 2147483647);
    EXPECT_EQ(plug("n.bare").asString(), "");
}

struct NameCase {
    const char* name;
    const char* result; // the plug's full name, or what is wrong with it
};

TEST_F(Plug, AreFoundByName) {
    create("testLists", "n");
    const std::vector<NameCase> rows = {
        {"n.lists", "n.lists"},
        {"n.lists[3].items[4294967295]", "n.lists[3].items[4294967295]"},
        {"n.leaf", "n.shallow.leaf"},
        {"n.shallow.leaf", "n.shallow.leaf"},
        {"n.items[0]", "'items' does not belong there"},
        {"n.lists.items", "'lists' is an array and needs an index"},
        {"n.note[0]", "'note' is not an array"},
        {"n.lists[x]", "'[x]' is no index"},
        {"n.lists[4294967296]", "'[4294967296]' is no index"},
        {"n.lists[-1]", "'[-1]' is no index"},
        {"n.lists[1", "'[1' is no index"},
        {"n.lists[1]].note", "'[1]]' is no index"},
        {"n.", "has no attribute ''"},
        {"n.shallow.note", "'note' does not belong there"},
        {"n.nothing", "node type 'testLists' has no attribute 'nothing'"},
        {"m.note", "there is no node named 'm'"},
        {"m", "there is no node named 'm'"},
    };
    for (const NameCase& row : rows) {
        SCOPED_TRACE(row.name);
        HSelectionList list;
        HPlug found;
        const HStatus status = list.add(HString(row.name));
        if (status.error())
            EXPECT_THAT(text(status), HasSubstr(row.result));
        else
            EXPECT_EQ(plug(row.name).name(), row.result);
    }
}

TEST_F(Plug, NodesAreFoundByPattern) {
    for (const char* name : {"arm1", "arm2", "leg1"})
        create("testSum", name);
    const std::vector<std::pair<const char*, unsigned>> rows = {
        {"arm?", 2}, {"*1", 3}, {"*", 4}, {"?", 0}, {"a*m*2", 1}};
    for (const auto& [pattern, count] : rows) {
        HSelectionList list;
        EXPECT_EQ(list.add(HString(pattern)).error(), count == 0) << pattern;
        EXPECT_EQ(list.length(), count) << pattern;
    }
}

TEST_F(Plug, RefuseToBeSetAndChangeNothing) {
    create("testSum", "n");
    create("testSum", "up");
    connect("up.total", "n.kept");
    plug("n.bare").setLocked(true);
    EXPECT_EQ(text(plug("n.total").setDouble(1)), "'n.total' is an output and cannot be set");
    EXPECT_EQ(text(plug("n.kept").setDouble(1)), "'n.kept' is connected from 'up.total' and cannot be set");
    EXPECT_EQ(text(plug("n.bare").setDouble(1)), "'n.bare' is locked");
    EXPECT_EQ(text(plug("n.text").setDouble(1)), "'text' is a string and cannot hold a number");
    EXPECT_EQ(text(plug("n.values[2]").setString("x")), "'values[0]' is a double and cannot hold that kind of data");
    EXPECT_EQ(text(plug("n.values").setDouble(1)), "'n.values' is an array: set its elements");
    EXPECT_EQ(text(plug("n.matrix").setHObject(HFnStringData().create("x"))),
              "'matrix' is a matrix and cannot hold that kind of data");
    EXPECT_EQ(text(HPlug().setDouble(1)), "the plug is null");
    EXPECT_EQ(plug("n.values").numElements(), 0U) << "a refused element does not come into being";
}

TEST_F(Plug, ReadWhatIsNotThereAsTheDefault) {
    create("testLists", "n");
    EXPECT_EQ(plug("n.lists[5].items[6]").asDouble(), 0.0);
    EXPECT_EQ(plug("n.lists").numElements(), 0U);
    create("testSum", "s");
    EXPECT_TRUE(plug("s.matrix").asMatrix() == HMatrix());
    EXPECT_EQ(plug("s.choice").asShort(), 1);
    EXPECT_TRUE(plug("s.text").asHObject().isNull());
}

// an array against a map, through the API alone
TEST_F(Plug, SparseArraysAreMaps) {
    create("testSum", "n");
    const HPlug array = plug("n.values");
    std::map<unsigned, double> model;
    std::mt19937 random(7);
    for (int step = 0; step < 6000; ++step) {
        const unsigned index = step % 3 == 0 ? static_cast<unsigned>(random()) : static_cast<unsigned>(random() % 1500);
        if (step % 7 == 6 && !model.empty()) {
            const auto victim = std::next(model.begin(), static_cast<std::ptrdiff_t>(random() % model.size()));
            HDGModifier modifier;
            modifier.removeMultiInstance(array.elementByLogicalIndex(victim->first), false);
            ASSERT_EQ(text(modifier.doIt()), "");
            model.erase(victim);
        } else {
            array.elementByLogicalIndex(index).setDouble(step);
            model[index] = step;
        }
    }
    std::vector<unsigned> indices;
    array.getExistingArrayAttributeIndices(indices);
    ASSERT_EQ(indices.size(), model.size());
    unsigned position = 0;
    for (const auto& [index, value] : model) {
        ASSERT_EQ(indices[position], index);
        ASSERT_EQ(array.elementByPhysicalIndex(position).logicalIndex(), index);
        ASSERT_EQ(array.elementByLogicalIndex(index).asDouble(), value);
        ++position;
    }
    EXPECT_TRUE(array.elementByPhysicalIndex(position).isNull());
}

TEST_F(Plug, WalkTheirTree) {
    create("testLists", "n");
    HPlug items = HPlug(plug("n.note").node(), HNodeClass("testLists").attribute("items"));
    EXPECT_EQ(items.name(), "n.lists[-1].items");
    EXPECT_EQ(text(items.selectAncestorLogicalIndex(4)), "");
    EXPECT_EQ(items.name(), "n.lists[-1].items[4]");
    EXPECT_EQ(text(items.selectAncestorLogicalIndex(2, HNodeClass("testLists").attribute("lists"))), "");
    EXPECT_EQ(items.name(), "n.lists[2].items[4]");
    EXPECT_TRUE(items.selectAncestorLogicalIndex(2, HNodeClass("testLists").attribute("flat")).error());
    EXPECT_EQ(items.array().name(), "n.lists[2].items");
    EXPECT_EQ(items.array().parent().name(), "n.lists[2]");
    EXPECT_EQ(items.array().parent().child(1).name(), "n.lists[2].weight");
    EXPECT_TRUE(items.parent().isNull());
    EXPECT_EQ(plug("n.lists[2]").numChildren(), 2U);
}

TEST_F(Plug, StaleHandlesAnswerWithAStatus) {
    const HObject node = create("testSum", "n");
    const HPlug value = plug("n.values[1]");
    value.elementByLogicalIndex(0);
    HPlug(value).setDouble(3.0);
    HStatus status;
    HDataHandle handle = value.asHDataHandle(&status);
    HFnDependencyNode set(node);
    HDataBlock block = set.userNode()->forceCache();
    HSelectionList list;
    list.add(node);
    HDGModifier modifier;
    modifier.deleteNode(node);
    EXPECT_EQ(text(modifier.doIt()), "");

    EXPECT_TRUE(node.isNull());
    EXPECT_EQ(node.apiType(), HFn::kInvalid);
    EXPECT_TRUE(value.isNull());
    EXPECT_EQ(value.asDouble(&status), 0.0);
    EXPECT_EQ(text(status), "the plug is null");
    EXPECT_EQ(handle.asDouble(), 3.0) << "the last value";
    EXPECT_EQ(text(handle.set(4.0)), "");
    EXPECT_EQ(set.name(), "");
    EXPECT_FALSE(block.inputValue(HNodeClass("testSum").attribute("scale"), &status).isValid());
    EXPECT_EQ(status, HStatus::kInvalidParameter);
    HObject found;
    EXPECT_TRUE(list.getDependNode(0, found).error());
    EXPECT_EQ(set.userNode(), nullptr);
}

using Event = std::pair<int, std::string>; // mask, and both plugs

void record(int mask, HPlug& changed, HPlug& other, void* data) {
    static_cast<std::vector<Event>*>(data)->emplace_back(mask, (changed.name() + " " + other.name()).asStdString());
}

TEST_F(Plug, ChangesAreTold) {
    const HObject node = create("testSum", "n");
    create("testSum", "up");
    std::vector<Event> events;
    HStatus status;
    const HCallbackId id = HNodeMessage::addAttributeChangedCallback(node, record, &events, &status);
    EXPECT_EQ(text(status), "");
    plug("n.values[3]").setDouble(1);
    plug("n.bare").setLocked(true);
    connect("up.total", "n.values[3]");
    disconnect("up.total", "n.values[3]");
    using M = HNodeMessage;
    EXPECT_THAT(
        events,
        ElementsAre(Event{M::kAttributeArrayAdded, "n.values[3] "}, Event{M::kAttributeSet, "n.values[3] "},
                    Event{M::kAttributeLocked, "n.bare "},
                    Event{M::kConnectionMade | M::kIncomingDirection | M::kOtherPlugSet, "n.values[3] up.total"},
                    Event{M::kConnectionBroken | M::kIncomingDirection | M::kOtherPlugSet, "n.values[3] up.total"},
                    Event{M::kAttributeArrayRemoved, "n.values[3] "}));
    events.clear();
    EXPECT_EQ(text(HMessage::removeCallback(id)), "");
    EXPECT_EQ(text(HMessage::removeCallback(id)),
              "HMessage::removeCallback: there is no callback " + std::to_string(id));
    plug("n.values[0]").setDouble(1);
    EXPECT_TRUE(events.empty());
}

HCallbackId second = 0;

TEST_F(Plug, ACallbackMayRemoveAnotherAndDeleteNothingElse) {
    const HObject node = create("testSum", "n");
    std::vector<Event> events;
    HNodeMessage::addAttributeChangedCallback(node,
                                              [](int, HPlug&, HPlug&, void*) { HMessage::removeCallback(second); });
    second = HNodeMessage::addAttributeChangedCallback(node, record, &events);
    plug("n.bare").setDouble(1);
    EXPECT_TRUE(events.empty());
    HNodeMessage::addAttributeChangedCallback(node, [](int, HPlug&, HPlug&, void*) { throw 1; });
    plug("n.bare").setDouble(2);
    EXPECT_EQ(takeMessages().front(), "error: n: attribute-changed callback: an exception of an unknown type");
    takeMessages();
}

} // namespace
