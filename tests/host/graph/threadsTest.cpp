// SPDX-License-Identifier: Apache-2.0
// Several plugs evaluated at the same time: same values, same number of computes, no race.
#include "host/support/SceneTest.h"

#include "openquarn/HDGModifier.h"
#include "openquarn/HFnDependencyNode.h"
#include "openquarn/HPxNode.h"
#include "openquarn_app/Evaluation.h"

#include <atomic>
#include <random>

namespace {

using namespace testNodes;

class Threads : public SceneTest {};

// a random graph of sums; every node reads some earlier ones
HPlugArray randomGraph(unsigned nodes, unsigned seed) {
    std::mt19937 random(seed);
    std::vector<HFnDependencyNode> sets;
    HPlugArray outputs;
    HDGModifier modifier;
    for (unsigned i = 0; i < nodes; ++i) {
        sets.emplace_back(create("testSum"));
        for (unsigned k = 0; k < 3 && i > 0; ++k)
            modifier.connect(sets[random() % i].findPlug("total"), sets[i].findPlug("values").elementByLogicalIndex(k));
        modifier.newPlugValueDouble(sets[i].findPlug("scale"), 0.25 + 0.125 * static_cast<double>(random() % 4));
        modifier.newPlugValueDouble(sets[i].findPlug("values").elementByLogicalIndex(9),
                                    static_cast<double>(random() % 100));
        outputs.push_back(sets[i].findPlug("total"));
    }
    EXPECT_EQ(text(modifier.doIt()), "");
    return outputs;
}

TEST_F(Threads, GiveTheSameAsOne) {
    const HPlugArray plugs = randomGraph(200, 3);
    EXPECT_EQ(text(OpenQuarn::evaluate(plugs, false)), "");
    std::vector<double> expected;
    for (const HPlug& output : plugs)
        expected.push_back(output.asDouble());
    for (int round = 0; round < 20; ++round) {
        EXPECT_EQ(text(OpenQuarn::makeDirty(plugs.front())), "");
        OpenQuarn::ComputeWatch computes;
        EXPECT_EQ(text(OpenQuarn::evaluate(plugs, true)), "");
        for (std::size_t i = 0; i < plugs.size(); ++i)
            ASSERT_EQ(plugs[i].asDouble(), expected[i]);
        std::vector<std::string> once = computes.plugs();
        std::sort(once.begin(), once.end());
        EXPECT_EQ(std::unique(once.begin(), once.end()), once.end()) << "nothing is computed twice";
    }
}

TEST_F(Threads, TwoNodesThatNeedEachOthersOtherOutputsDoNotWaitForEver) {
    create("testCase", "a");
    create("testCase", "b");
    // a.out needs b.outs[0]; b.out needs a.outs[0]: no circle of plugs, but one of nodes
    Hooks::compute = [](HPxNode& node, const HPlug& asked, HDataBlock& block) {
        double value = 1.0;
        if (!asked.isElement())
            value += plug(node.name() == "a" ? "b.outs[0]" : "a.outs[0]").asDouble();
        return block.outputValue(asked).set(value);
    };
    for (int round = 0; round < 200; ++round) {
        OpenQuarn::makeDirty(plug("a.out").node());
        OpenQuarn::makeDirty(plug("b.out").node());
        EXPECT_EQ(text(OpenQuarn::evaluate({plug("a.out"), plug("b.out")}, true)), "");
        ASSERT_EQ(plug("a.out").asDouble() + plug("b.out").asDouble(), 4.0);
    }
}

// as many elements as "in" says, each with its index and the value of "ins[0]"; the others go
HStatus fillOuts(HPxNode& node, const HPlug&, HDataBlock& block) {
    const HFnDependencyNode set(node.thisHObject());
    const int count = static_cast<int>(block.inputValue(set.attribute("in")).asDouble());
    const double value = block.inputArrayValue(set.attribute("ins")).inputValue().asDouble();
    HArrayDataHandle outs = block.outputArrayValue(set.attribute("outs"));
    HArrayDataBuilder builder = outs.builder();
    for (int i = 0; i < count; ++i)
        builder.addElement(static_cast<unsigned>(i)).set(value + i);
    for (unsigned surplus = 64; surplus > static_cast<unsigned>(count); --surplus)
        builder.removeElement(surplus - 1); // where there is one
    outs.set(builder);
    return outs.setAllClean();
}

TEST_F(Threads, ElementsMayGoWhileOthersWaitForThem) {
    constexpr unsigned many = 64;
    constexpr unsigned few = 3;
    create("testCase", "node");
    const auto passOn = Hooks::compute;
    Hooks::compute = [&](HPxNode& node, const HPlug& asked, HDataBlock& block) {
        return node.name() == "node" ? fillOuts(node, asked, block) : passOn(node, asked, block);
    };
    HPlugArray elements;
    HPlugArray readers;
    for (unsigned i = 0; i < many; ++i) {
        elements.push_back(plug("node.outs").elementByLogicalIndex(i));
        readers.push_back(HFnDependencyNode(create("testCase")).findPlug("out"));
    }
    HPlugArray all = elements;
    all.insert(all.end(), readers.begin(), readers.end());
    for (int round = 1; round <= 100; ++round) {
        HDGModifier modifier;
        for (unsigned i = round == 1 ? 0 : few; i < many; ++i)
            modifier.connect(elements[i], HFnDependencyNode(readers[i].node()).findPlug("in"));
        EXPECT_EQ(text(modifier.doIt()), "");
        plug("node.ins[0]").setDouble(1000.0 * round);
        plug("node.in").setDouble(many);
        EXPECT_EQ(text(OpenQuarn::evaluate(elements, true)), "");
        plug("node.in").setDouble(few);
        EXPECT_EQ(text(OpenQuarn::evaluate(all, true)), "") << "as on one thread: what has gone is no failure";
        EXPECT_EQ(plug("node.outs").numElements(), few);
        for (unsigned i = 0; i < many; ++i) {
            const double value = HFnDependencyNode(readers[i].node()).findPlug("in").asDouble();
            ASSERT_EQ(value, i < few ? 1000.0 * round + i : 0.0) << "an element that has gone gives no value: " << i;
        }
    }
}

TEST_F(Threads, TheFirstFailureInOrderIsTheAnswer) {
    HPlugArray plugs;
    for (int i = 0; i < 8; ++i)
        plugs.push_back(HFnDependencyNode(create("testCase")).findPlug("out"));
    Hooks::compute = [](HPxNode& node, const HPlug&, HDataBlock&) {
        return HStatus(HStatus::kFailure, node.name().asStdString());
    };
    EXPECT_EQ(text(OpenQuarn::evaluate(plugs, true)), plugs.front().node().isNull() ? "" : "testCase1");
    EXPECT_EQ(takeMessages().size(), 8U) << "all are evaluated";
}

} // namespace
