// SPDX-License-Identifier: Apache-2.0
// What the three nodes have in common: their attributes, their profile, the way from matrices to control values.
#include "plugin/controls/ControlsTest.h"

#include "controls/guardedCompute.h"
#include "openquarn/HFnDependencyNode.h"
#include "plugin/traceEvents.h"
#include "support/pageExamples.h"

#include <algorithm>
#include <functional>
#include <stdexcept>

namespace {

using ::testing::IsEmpty;
using ::testing::SizeIs;

using ControlNodes = ControlsTest;

TEST_F(ControlNodes, NothingIsThrownAtTheHost) {
    const HPxNode& node = *HFnDependencyNode(testNodes::create("controlCollector", "c")).userNode();
    const auto statusOf = [&](const std::function<void()>& raise) {
        const HStatus status = neuralWarp::guardedCompute(node, "compute", [&]() -> HStatus {
            raise();
            return HStatus::kNotFound;
        });
        return std::to_string(status.statusCode()) + ' ' + testNodes::text(status);
    };
    EXPECT_EQ(statusOf([] {}), "6 not found");
    EXPECT_EQ(statusOf([] { throw std::bad_alloc(); }), "2 out of memory");
    EXPECT_EQ(statusOf([] { throw std::runtime_error("too far"); }), "1 node 'c', compute: too far");
    EXPECT_EQ(statusOf([] { throw 1; }), "1 node 'c', compute: unknown exception");
}

TEST_F(ControlNodes, EveryComputeShowsInTheProfile) {
    const struct {
        const char *type, *output, *label;
    } rows[] = {{"controlCollector", "n.output", "Evaluation controlCollectorNode::compute 10"},
                {"matrixConverter", "n.flatOutput", "Evaluation matrixConverterNode::compute 10"},
                {"orthoAxisFromMatrixArray", "n.outputList", "Evaluation orthoAxisFromMatrixArray::compute 10"}};
    for (const auto& row : rows) {
        run(std::string("file -new; createNode ") + row.type + " -name n");
        const std::vector<TraceEvent> events =
            recordedEvents("n", [&] { EXPECT_FALSE(OpenQuarn::evaluate(testNodes::plug(row.output)).error()); });
        EXPECT_TRUE(std::ranges::any_of(events, [&](const TraceEvent& e) { return e.label == row.label; })) << row.type;
    }
}

TEST_F(ControlNodes, MatricesBecomeControlValues) {
    const std::string moved = " 1 0 0 0  0 1 0 0  0 0 1 0  4 5 6 1;";
    run("createNode matrixConverter -name joints; setAttr joints.input[1]" + moved + "setAttr joints.input[4]" + moved +
        "createNode matrixConverter -name m; setAttr m.extractRotation off; setAttr m.extractScale off;"
        "createNode orthoAxisFromMatrixArray -name o; createNode controlCollector -name c;"
        "createNode testSum -name sink;"
        "connectAttr joints.input m.input; connectAttr joints.input[4] o.input[2];"
        "connectAttr m.flatOutput c.inputList[0].input; connectAttr o.outputList[2].output c.inputList[3].input;"
        "connectAttr m.outputList[4].output[0] c.inputList[7].input[0]; connectAttr c.output sink.values");
    EXPECT_EQ(values("sink.values"), (Values{4, 5, 6, 4, 5, 6, 1, 0, 0, 0, 1, 0, 4}));

    run("setAttr joints.input[4] 0 1 0 0  -1 0 0 0  0 0 1 0  7 8 9 1; setAttr m.translationY off");
    EXPECT_EQ(values("sink.values"), (Values{4, 6, 7, 9, 0, 1, 0, -1, 0, 0, 7}));

    removeElement("joints.input[1]");
    EXPECT_EQ(values("sink.values"), (Values{7, 9, 0, 1, 0, -1, 0, 0, 7}));
    EXPECT_THAT(indices("sink.values"), SizeIs(9));

    run("disconnectAttr joints.input m.input; disconnectAttr o.outputList[2].output c.inputList[3].input");
    EXPECT_THAT(indices("c.inputList[3].input"), IsEmpty());
    removeElement("m.input[4]");                   // a list that is no longer connected keeps its matrices
    EXPECT_EQ(values("sink.values"), (Values{7})); // outputList[4] stays as it was
}

TEST_F(ControlNodes, OnSeveralThreadsTheyGiveTheSame) {
    run("createNode matrixConverter -name m; createNode orthoAxisFromMatrixArray -name o;"
        "connectAttr m.input o.input; setAttr m.input[3] 0 2 0 0  -3 0 0 0  0 0 4 0  5 6 7 1");
    HPlugArray outputs;
    for (int i = 0; i < 40; ++i) {
        const std::string name = "c" + std::to_string(i);
        run("createNode controlCollector -name " + name + "; connectAttr m.flatOutput " + name +
            ".inputList[0].input; connectAttr o.outputList[3].output " + name + ".inputList[1].input");
        outputs.push_back(testNodes::plug(name + ".output"));
    }
    EXPECT_FALSE(OpenQuarn::evaluate(outputs, true).error());
    for (const HPlug& output : outputs)
        EXPECT_EQ(values(output.name().asStdString()), values("c0.output"));
    EXPECT_THAT(values("c0.output"), SizeIs(15));
    EXPECT_EQ(OpenQuarn::computeCount(testNodes::plug("o.input").node()), 1U);
}

TEST_F(ControlNodes, ThePagesExamplesGiveWhatThePageSays) {
    std::ifstream page(NW_CONTROL_NODES_PAGE);
    ASSERT_TRUE(page) << NW_CONTROL_NODES_PAGE;
    EXPECT_GE(comparePageExamples(page, [&](const std::string& line) { return run(line); }), 8);
}

} // namespace
