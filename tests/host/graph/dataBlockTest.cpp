// SPDX-License-Identifier: Apache-2.0
// Data blocks, array handles and builders, plug-in data, other contexts.
#include "host/support/SceneTest.h"

#include "openquarn/HDataBlock.h"
#include "openquarn/HFnDependencyNode.h"
#include "openquarn/HNodeClass.h"
#include "openquarn/HPxNode.h"
#include "openquarn_app/Evaluation.h"

#include <map>

namespace {

using namespace testNodes;
using ::testing::ElementsAre;
using ::testing::IsEmpty;

class DataBlock : public SceneTest {
protected:
    static HDataBlock blockOf(const HObject& node) { return HFnDependencyNode(node).userNode()->forceCache(); }
    static HObject attribute(const char* type, const char* name) { return HNodeClass(type).attribute(name); }
};

TEST_F(DataBlock, OutputArraysEvaluateNothingUntilAnElementIsRead) {
    create("testSum", "up");
    create("testSum", "other");
    const HObject node = create("testSum", "n");
    connect("up.total", "n.values[2]");
    connect("other.total", "n.values[5]");
    plug("up.values[0]").setDouble(3.0);
    OpenQuarn::ComputeWatch computes;
    HDataBlock block = blockOf(node);
    HStatus status;
    HArrayDataHandle values = block.outputArrayValue(attribute("testSum", "values"), &status);
    EXPECT_EQ(text(status), "");
    EXPECT_EQ(values.elementCount(), 2U);
    EXPECT_EQ(text(values.jumpToElement(2)), "");
    EXPECT_EQ(values.outputValue().asDouble(), 0.0) << "as it is, without evaluating";
    EXPECT_THAT(computes.plugs(), IsEmpty());
    EXPECT_EQ(values.inputValue().asDouble(), 3.0);
    EXPECT_THAT(computes.plugs(), ElementsAre("up.total")) << "and not the other element";
    block.inputArrayValue(attribute("testSum", "values"));
    EXPECT_THAT(computes.plugs(), ElementsAre("up.total", "other.total"));
}

TEST_F(DataBlock, ArrayHandlesSayWhereTheyStand) {
    const HObject node = create("testSum", "n");
    for (const unsigned index : {9U, 2U, 4294967295U})
        plug("n.values[" + std::to_string(index) + "]").setDouble(index);
    HArrayDataHandle values = blockOf(node).inputArrayValue(attribute("testSum", "values"));
    std::vector<unsigned> visited{values.elementIndex()};
    while (!values.next().error())
        visited.push_back(values.elementIndex());
    EXPECT_THAT(visited, ElementsAre(2U, 9U, 4294967295U));
    HStatus status;
    EXPECT_FALSE(values.inputValue(&status).isValid());
    EXPECT_TRUE(status.error());
    EXPECT_EQ(text(values.jumpToElement(3)), "'n.values' has no element 3");
    EXPECT_EQ(text(values.jumpToArrayElement(9)), "");
    EXPECT_TRUE(values.jumpToElement(3).error());
    EXPECT_EQ(values.elementIndex(), 9U) << "a failed jump stays where it was";
    EXPECT_EQ(text(values.jumpToPosition(0)), "");
    EXPECT_EQ(values.elementIndex(), 2U);
    EXPECT_TRUE(values.jumpToPosition(3).error());
}

TEST_F(DataBlock, WrongRequestsFail) {
    HDataBlock block = blockOf(create("testSum", "n"));
    HDataBlock listBlock = blockOf(create("testLists", "l"));
    std::map<std::string, HStatus> invalid;
    block.inputValue(attribute("testSum", "values"), &invalid["an array as a value"]);
    block.inputArrayValue(attribute("testSum", "scale"), &invalid["a value as an array"]);
    block.inputValue(attribute("testLists", "note"), &invalid["of another type"]);
    listBlock.outputArrayValue(attribute("testLists", "items"), &invalid["below an array"]);
    HDataBlock().inputValue(attribute("testSum", "scale"), &invalid["no block"]);
    block.outputValue(plug("l.note"), &invalid["another node's"]);
    for (const auto& [name, status] : invalid) {
        EXPECT_EQ(status, HStatus::kInvalidParameter) << name;
        EXPECT_NE(text(status), "") << name;
    }
    HStatus status;
    block.outputArrayValue(attribute("testSum", "values")).builder(&status);
    EXPECT_EQ(status, HStatus::kFailure) << "no builder";
}

TEST_F(DataBlock, BuildersTakeEffectWhenTheyAreSet) {
    const HObject node = create("testLists", "n");
    plug("n.lists[1].weight").setDouble(1.0);
    plug("n.lists[4].weight").setDouble(4.0);
    HArrayDataHandle array = blockOf(node).outputArrayValue(attribute("testLists", "lists"));
    HArrayDataBuilder builder = array.builder();
    EXPECT_EQ(text(builder.addElement(7).child(attribute("testLists", "weight")).set(7.0)), "");
    EXPECT_EQ(text(builder.removeElement(1)), "");
    EXPECT_TRUE(builder.removeElement(1).error());
    EXPECT_EQ(builder.elementCount(), 2U);
    EXPECT_EQ(array.elementCount(), 2U);
    EXPECT_TRUE(array.jumpToElement(7).error()) << "not before it is set";
    EXPECT_EQ(text(array.set(builder)), "");
    EXPECT_EQ(array.elementIndex(), 4U);
    EXPECT_EQ(text(array.jumpToElement(7)), "");
    EXPECT_EQ(plug("n.lists[7].weight").asDouble(), 7.0);
    EXPECT_TRUE(array.jumpToElement(1).error());
    HArrayDataHandle other = blockOf(create("testLists", "m")).outputArrayValue(attribute("testLists", "lists"));
    HArrayDataBuilder foreign = other.builder();
    EXPECT_EQ(array.set(foreign), HStatus::kInvalidParameter);
}

TEST_F(DataBlock, PlugHandlesAreGivenBack) {
    create("testSum", "n");
    plug("n.values[0]").setDouble(2.0);
    const HPlug total = plug("n.total");
    HStatus status;
    HDataHandle handle = total.asHDataHandle(&status);
    EXPECT_EQ(text(status), "");
    EXPECT_EQ(handle.asDouble(), 2.0);
    EXPECT_EQ(handle.type(), HFnData::kNumeric);
    EXPECT_EQ(text(total.destructHandle(handle)), "");
    EXPECT_FALSE(handle.isValid());
    EXPECT_TRUE(total.destructHandle(handle).error());
}

TEST_F(DataBlock, AnotherContextLeavesTheSceneAlone) {
    create("testSum", "n");
    create("testSum", "down");
    connect("time1.outTime", "n.values[0]");
    connect("n.total", "down.values[0]");
    session.setTime(5.0);
    EXPECT_EQ(plug("down.total").asDouble(), 5.0);
    const unsigned before = OpenQuarn::computeCount(plug("n.total").node());
    bool normal = true;
    double time = 0.0;
    create("testCase", "probe");
    connect("down.total", "probe.in");
    Hooks::compute = [&](HPxNode& node, const HPlug& asked, HDataBlock& block) {
        normal = HDGContext::current().isNormal() || block.context().isNormal();
        time = HDGContext::current().time();
        return block.outputValue(asked).set(
            block.inputValue(HFnDependencyNode(node.thisHObject()).attribute("in")).asDouble());
    };
    {
        OpenQuarn::EvaluationContext context(12.0);
        HStatus status;
        EXPECT_EQ(context.evaluateAt(plug("probe.out"), &status).asDouble(), 12.0);
        EXPECT_EQ(text(status), "");
        EXPECT_FALSE(normal);
        EXPECT_EQ(time, 12.0);
        context.setTime(13.0);
        EXPECT_EQ(context.evaluateAt(plug("probe.out")).asDouble(), 13.0);
        EXPECT_EQ(context.evaluateAt(plug("probe.out")).asDouble(), 13.0);
    }
    EXPECT_EQ(OpenQuarn::computeCount(plug("n.total").node()), before + 2);
    OpenQuarn::ComputeWatch computes;
    EXPECT_EQ(plug("down.total").asDouble(), 5.0);
    EXPECT_THAT(computes.plugs(), IsEmpty()) << "the scene's values are still clean";
    EXPECT_EQ(session.time(), 5.0);
    EXPECT_TRUE(HDGContext::current().isNormal());
}

} // namespace
