// SPDX-License-Identifier: Apache-2.0
// Plug-ins that change the graph while the graph is being changed, and handles that outlive what they stand for.
#include "host/support/SceneTest.h"

#include "openquarn/HDGModifier.h"
#include "openquarn/HFnDependencyNode.h"
#include "openquarn_app/Evaluation.h"
#include "openquarn_app/Plugins.h"

namespace {

using testNodes::Hooks;
using testNodes::plug;

class Reentry : public SceneTest {
protected:
    Reentry() {
        first = testNodes::create("testCase", "first");
        second = testNodes::create("testCase", "second");
    }

    /// Connects first.out to second.in, and runs `change` once, when that is broken.
    static void whenBroken(const std::function<void()>& change) {
        testNodes::connect("first.out", "second.in");
        Hooks::connection = [change](const char* what, const HPlug&, const HPlug&, bool) {
            if (std::string(what) != "broken")
                return;
            const std::function<void()> once = change;
            Hooks::connection = nullptr;
            once();
        };
    }

    static HStatus remove(const HObject& node) {
        HDGModifier modifier;
        modifier.deleteNode(node);
        return modifier.doIt();
    }

    HObject first, second;
};

TEST_F(Reentry, ADeletedNodeMayDeleteItselfAndTheOther) {
    whenBroken([&] {
        EXPECT_EQ(testNodes::text(remove(second)), "");
        EXPECT_EQ(testNodes::text(remove(first)), "");
    });
    EXPECT_EQ(testNodes::text(remove(first)), "");
    EXPECT_TRUE(first.isNull() && second.isNull());
    EXPECT_EQ(session.nodeCount(), 1U);
}

TEST_F(Reentry, TheSceneMayGrowAndRenameUnderADeletion) {
    whenBroken([&] {
        for (int i = 0; i < 500; ++i)
            testNodes::create("testCase");
        EXPECT_FALSE(HFnDependencyNode(first).setName("other").error());
    });
    EXPECT_EQ(testNodes::text(remove(first)), "");
    EXPECT_TRUE(plug("other.in").isNull());
    EXPECT_EQ(session.nodeCount(), 502U);
}

TEST_F(Reentry, WhatIsConnectedAgainToADeletedNodeIsLetGo) {
    testNodes::connect("first.out", "second.in");
    Hooks::connection = [&](const char* what, const HPlug& own, const HPlug& other, bool asSource) {
        if (std::string(what) == "broken" && asSource) {
            HDGModifier modifier;
            modifier.connect(own, other);
            modifier.doIt();
        }
    };
    EXPECT_EQ(testNodes::text(remove(first)), "");
    Hooks::connection = nullptr;
    EXPECT_FALSE(plug("second.in").isConnected());
    EXPECT_EQ(testNodes::text(plug("second.in").setDouble(3.0)), "");
    EXPECT_EQ(plug("second.out").asDouble(), 3.0);
}

TEST_F(Reentry, AValueThatIsConnectedAgainIsNotReset) {
    const HObject sum = testNodes::create("testSum", "sum");
    testNodes::create("testSum", "target");
    plug("sum.scale").setDouble(5.0);
    testNodes::connect("first.out", "target.reset");
    Hooks::connection = [](const char* what, const HPlug&, const HPlug& other, bool asSource) {
        if (std::string(what) == "broken" && asSource) {
            HDGModifier modifier;
            modifier.connect(plug("sum.scale"), other);
            modifier.doIt();
        }
    };
    testNodes::disconnect("first.out", "target.reset");
    EXPECT_EQ(plug("target.reset").asDouble(), 5.0);
}

TEST_F(Reentry, ElementsThatAWholeArrayReplacesLoseTheirConnections) {
    testNodes::create("testCase", "third");
    plug("first.ins[1]").setDouble(1.0);
    testNodes::connect("second.ins[8]", "third.in");
    testNodes::connect("first.ins", "second.ins");
    EXPECT_EQ(plug("second.ins[1]").asDouble(), 1.0);
    EXPECT_EQ(plug("second.ins").numElements(), 1U);
    EXPECT_FALSE(plug("third.in").isConnected());
    EXPECT_FALSE(plug("third.in").setDouble(2.0).error());
    EXPECT_EQ(testNodes::text(remove(second)), "");
    EXPECT_EQ(plug("third.out").asDouble(), 2.0);
}

TEST_F(Reentry, HandlesOutliveNodesContextsAndPlugins) {
    plug("first.in").setDouble(4.0);
    HDataHandle value = plug("first.in").asHDataHandle();
    HArrayDataBuilder builder;
    HDataHandle added;
    {
        HDataBlock block = HFnDependencyNode(testNodes::create("testLists", "lists")).userNode()->forceCache();
        builder = block.outputArrayValue(plug("lists.flat").attribute()).builder();
        added = builder.addElement(3);
    }
    plug("lists.lists[2].weight").setDouble(5.0);
    HDataHandle list = plug("lists.lists[2]").asHDataHandle();
    const HObject weight = plug("lists.lists[2].weight").attribute();
    {
        OpenQuarn::EvaluationContext context(10.0);
        const HPlug out = plug("first.out");
        const HDataHandle elsewhere = context.evaluateAt(out);
        remove(first);
        context.setTime(11.0);
        EXPECT_FALSE(context.evaluateAt(out).isValid());
        EXPECT_EQ(elsewhere.asDouble(), 4.0);
    }
    session.newScene();
    HDataHandle part = list.child(weight);
    list = HDataHandle(); // what it held of the type passes to the part
    OpenQuarn::unloadPlugin(OpenQuarn::loadedPlugins().back());
    EXPECT_EQ(part.asDouble(), 5.0);
    EXPECT_EQ(testNodes::text(part.set("text")), "'weight' is a double and cannot hold that kind of data");
    EXPECT_EQ(value.asDouble(), 4.0);
    EXPECT_EQ(testNodes::text(value.set("text")), "'in' is a double and cannot hold that kind of data");
    EXPECT_EQ(testNodes::text(added.set("text")), "'flat[3]' is a double and cannot hold that kind of data");
    EXPECT_EQ(builder.elementCount(), 1U);
}

TEST_F(Reentry, NullPlugsAreInvalidParameters) {
    const HPlug null;
    HStatus status;
    const auto expect = [&](const char* call) {
        EXPECT_EQ(status.statusCode(), HStatus::kInvalidParameter) << call;
        status = HStatus();
    };
    null.logicalIndex(&status), expect("logicalIndex");
    null.numElements(&status), expect("numElements");
    null.elementByLogicalIndex(0, &status), expect("elementByLogicalIndex");
    null.elementByPhysicalIndex(0, &status), expect("elementByPhysicalIndex");
    null.array(&status), expect("array");
    null.numChildren(&status), expect("numChildren");
    null.child(0, &status), expect("child");
    null.parent(&status), expect("parent");
    null.source(&status), expect("source");
    null.asDouble(&status), expect("asDouble");
    null.asHDataHandle(&status), expect("asHDataHandle");
}

} // namespace
