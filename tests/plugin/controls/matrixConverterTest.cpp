// SPDX-License-Identifier: Apache-2.0
#include "plugin/controls/ControlsTest.h"

#include <numbers>

namespace {

using ::testing::DoubleNear;
using ::testing::ElementsAre;
using ::testing::IsEmpty;
using ::testing::Pointwise;
using ::testing::SizeIs;

const std::string identity = " 1 0 0 0  0 1 0 0  0 0 1 0  0 0 0 1;";
// scaled by 2, 3, 4, turned by a quarter about z, moved by 5, 6, 7
const std::string turned = " 0 2 0 0  -3 0 0 0  0 0 4 0  5 6 7 1;";
constexpr double quarter = std::numbers::pi / 2;

class MatrixConverter : public ControlsTest {
protected:
    MatrixConverter() { converter = testNodes::create("matrixConverter", "m"); }

    HObject converter;
};

TEST_F(MatrixConverter, EmitsTheChannelsThatAreSwitchedOn) {
    const double half = std::sqrt(0.5);
    struct Row {
        const char* script;
        Values expected;
    };
    const Row rows[] = {
        {"", {0, 0, quarter, 2, 3, 4, 5, 6, 7}},
        {"setAttr m.extractRotation off; setAttr m.scaleX off; setAttr m.translationZ off", {3, 4, 5, 6}},
        {"setAttr m.extractScale off; setAttr m.extractTranslation off; setAttr m.rotationX off", {0, quarter}},
        {"setAttr m.rotationConversion Quaternion; setAttr m.extractScale off; setAttr m.extractTranslation off",
         {0, 0, half, half}},
        // an axis that is off is not turned about, and the number of values stays
        {"setAttr m.rotationConversion 3; setAttr m.rotationZ off; setAttr m.extractScale off",
         {1, 0, 0, 0, 1, 0, 0, 0, 1, 5, 6, 7}},
        {"setAttr m.rotationConversion 4; setAttr m.translationX off", {2, 3, 4, 6, 7}},
        {"setAttr m.rotationConversion -1; setAttr m.extractScale off; setAttr m.extractTranslation off", {}},
    };
    for (const Row& row : rows) {
        run("file -new; createNode matrixConverter -name m; setAttr m.input[3]" + turned + row.script);
        EXPECT_THAT(values("m.flatOutput"), Pointwise(DoubleNear(1e-15), row.expected)) << row.script;
        EXPECT_EQ(values("m.outputList[3].output"), values("m.flatOutput")) << row.script;
    }
}

TEST_F(MatrixConverter, ListKeepsIndicesAndFlatClosesUp) {
    run("setAttr m.input[5]" + turned + "setAttr m.input[0]" + identity);
    const Values flat = values("m.flatOutput");
    ASSERT_THAT(flat, SizeIs(18));
    EXPECT_EQ(values("m.outputList[0].output"), Values(flat.begin(), flat.begin() + 9));
    EXPECT_EQ(values("m.outputList[5].output"), Values(flat.begin() + 9, flat.end()));
    EXPECT_THAT(indices("m.outputList"), ElementsAre(0, 5));

    run("setAttr m.extractRotation off; setAttr m.extractScale off");
    EXPECT_EQ(values("m.flatOutput"), (Values{0, 0, 0, 5, 6, 7}));
    EXPECT_EQ(values("m.outputList[5].output"), (Values{5, 6, 7}));
}

TEST_F(MatrixConverter, OneElementAskedForWritesAllThatHaveMatrices) {
    run("setAttr m.input[1]" + identity + "setAttr m.input[2]" + turned);
    values("m.outputList[1].output");
    run("setAttr m.extractRotation off; setAttr m.extractScale off");
    const unsigned before = OpenQuarn::computeCount(converter);
    EXPECT_EQ(testNodes::plug("m.outputList[1].output[2]").asDouble(), 0.0);
    EXPECT_EQ(values("m.outputList[2].output"), (Values{5, 6, 7}));
    EXPECT_EQ(OpenQuarn::computeCount(converter), before + 1);
    EXPECT_EQ(values("m.flatOutput"), (Values{0, 0, 0, 5, 6, 7})); // an output of its own
    EXPECT_EQ(OpenQuarn::computeCount(converter), before + 2);
}

TEST_F(MatrixConverter, WithoutMatricesFlatIsEmptyAndTheListStays) {
    run("createNode matrixConverter -name source; setAttr source.input[0]" + identity + "setAttr source.input[1]" +
        turned + "connectAttr source.input[0] m.input[4]; connectAttr source.input[1] m.input[6]");
    const Values list = values("m.outputList[6].output");
    EXPECT_THAT(values("m.flatOutput"), SizeIs(18));
    run("disconnectAttr source.input[0] m.input[4]; disconnectAttr source.input[1] m.input[6]");
    EXPECT_THAT(indices("m.input"), IsEmpty());
    EXPECT_EQ(values("m.outputList[6].output"), list); // which empties flatOutput, too
    EXPECT_THAT(values("m.flatOutput"), IsEmpty());
    EXPECT_THAT(indices("m.outputList"), ElementsAre(4, 6));
}

TEST_F(MatrixConverter, AnElementWithoutAMatrixFailsAndLeavesTheOutputs) {
    run("setAttr m.input[0]" + turned);
    const Values flat = values("m.flatOutput");
    run("createNode matrixConverter -name source; connectAttr source.input[0] m.input[7]; setAttr m.input[0]" +
        identity);
    for (const std::string output : {"m.flatOutput", "m.outputList"}) {
        EXPECT_EQ(OpenQuarn::evaluate(testNodes::plug(output)).statusCode(), HStatus::kInvalidParameter);
        EXPECT_THAT(takeMessages(), ElementsAre(::testing::StartsWith(
                                        "report: '" + output + "' could not be computed: input[7] holds no matrix")));
    }
    EXPECT_EQ(values("m.flatOutput"), flat);
    EXPECT_THAT(indices("m.outputList"), IsEmpty());
}

TEST_F(MatrixConverter, ReturnsTheStatusOfTheHostCallThatFailed) {
    const Values before{0, 0, quarter, 2, 3, 4, 5, 6, 7};
    const Values both{0, 0, quarter, 2, 3, 4, 5, 6, 7, 0, 0, quarter, 2, 3, 4, 5, 6, 7};
    Values partly = both, written = both;
    partly[0] = partly[3] = 5;
    std::copy_n(Values{5, 6, 7, 5}.begin(), 4, partly.begin());
    std::copy_n(Values{5, 6, 7, 5, 6, 7}.begin(), 6, written.begin());
    struct Row {
        const char* plug;
        FaultCase fault;
    };
    const Row rows[] = {
        {"m.flatOutput", {"HDataBlock::inputArrayValue", 1, false, both}},
        {"m.flatOutput", {"HDataBlock::inputValue", 1, false, both}},
        {"m.flatOutput", {"HDataBlock::inputValue", 13, false, both}},
        {"m.flatOutput", {"HArrayDataHandle::inputValue", 2, false, both}},
        {"m.flatOutput", {"HArrayDataHandle::elementIndex", 1, false, both}},
        {"m.flatOutput", {"HArrayDataHandle::next", 1, false, both}},
        {"m.flatOutput", {"HTransformationMatrix::translation", 2, false, both}},
        {"m.flatOutput", {"HDataBlock::outputArrayValue", 1, false, both}},
        {"m.flatOutput", {"HArrayDataHandle::builder", 1, false, both}},
        {"m.flatOutput", {"HArrayDataBuilder::addElement", 5, false, partly}},
        {"m.flatOutput", {"HArrayDataBuilder::removeElement", 12, false, written}},
        {"m.flatOutput", {"HArrayDataHandle::set", 1, false, written}},
        // the list: of outputList[5], after outputList[0] has been written
        {"m.outputList", {"HDataHandle::childArray", 2, false, before}},
        {"m.outputList", {"HArrayDataBuilder::addElement", 4, false, before}},
        {"m.outputList", {"HArrayDataBuilder::removeElement", 12, false, {5, 6, 7, 2, 3, 4, 5, 6, 7}}},
        {"m.outputList", {"HArrayDataHandle::set", 3, false, {5, 6, 7}}}, // the outer one
    };
    for (const auto& [plug, fault] : rows) {
        SCOPED_TRACE(std::string(fault.operation) + ' ' + std::to_string(fault.call));
        run("file -new; createNode matrixConverter -name m; setAttr m.input[0]" + turned + "setAttr m.input[5]" +
            turned);
        OpenQuarn::evaluate({testNodes::plug("m.flatOutput"), testNodes::plug("m.outputList")}, false);
        run("setAttr m.extractRotation off; setAttr m.extractScale off");
        evaluateWith(fault, plug);
        const bool isFlat = plug == std::string("m.flatOutput");
        EXPECT_EQ(values(isFlat ? "m.flatOutput" : "m.outputList[5].output"), fault.expected);
        EXPECT_EQ(isFlat ? Values() : values("m.outputList[0].output"), isFlat ? Values() : Values({5, 6, 7}));
    }
}

} // namespace
