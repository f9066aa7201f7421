// SPDX-License-Identifier: Apache-2.0
#include "plugin/controls/ControlsTest.h"

#include "openquarn/HMatrix.h"

#include <random>

namespace {

using ::testing::ElementsAre;

const std::string doubled = " 2 0 0 0  0 2 0 0  0 0 2 0  0 0 0 1;";
const std::string sheared = " 0 3 0 0  0 5 1e-3 0  0 0 0 0  1 2 3 1;";

class OrthoAxis : public ControlsTest {
protected:
    OrthoAxis() { testNodes::create("orthoAxisFromMatrixArray", "o"); }

    /// The numbers in an element of the list; none where there is no such element.
    static Values written(unsigned index) {
        const Indices all = indices("o.outputList");
        const bool exists = std::find(all.begin(), all.end(), index) != all.end();
        return exists ? values("o.outputList[" + std::to_string(index) + "].output") : Values();
    }
};

TEST_F(OrthoAxis, TheTwoAxesAreAlwaysOrthonormal) {
    std::mt19937 random(4);
    std::uniform_real_distribution<double> entry(-1.0, 1.0);
    for (unsigned i = 0; i < 200; ++i) {
        HMatrix matrix;
        for (unsigned row = 0; row < 3; ++row)
            matrix.setRow(row, HVector(entry(random), entry(random), entry(random)) * std::pow(10.0, i % 60 - 30.0));
        testNodes::plug("o.input[" + std::to_string(i) + "]").setMatrix(matrix);
        const Values v = values("o.outputList[" + std::to_string(i) + "].output");
        ASSERT_EQ(v.size(), 6U);
        const HVector x(v[0], v[1], v[2]), y(v[3], v[4], v[5]);
        EXPECT_NEAR(x.length(), 1.0, 1e-14);
        EXPECT_NEAR(y.length(), 1.0, 1e-14);
        EXPECT_NEAR(x * y, 0.0, 1e-10) << i;
        EXPECT_GT(x * matrix.row(0), 0.0);
        EXPECT_GT(y * matrix.row(1), 0.0);
    }
}

TEST_F(OrthoAxis, WhatHasNoMatrixStaysAsItIs) {
    run("createNode matrixConverter -name source; setAttr source.input[0]" + doubled +
        "connectAttr source.input[0] o.input[3]; setAttr o.input[4]" + sheared +
        "setAttr o.outputList[3].output[7] 0.5; setAttr o.outputList[9].output 8 9");
    EXPECT_EQ(values("o.outputList[3].output"), (Values{1, 0, 0, 0, 1, 0, 0.5})); // beyond the six, nothing is removed
    EXPECT_EQ(values("o.outputList[9].output"), (Values{8, 9}));
    run("disconnectAttr source.input[0] o.input[3]");
    EXPECT_THAT(indices("o.input"), ElementsAre(4));
    EXPECT_EQ(values("o.outputList[3].output"), (Values{1, 0, 0, 0, 1, 0, 0.5}));
    removeElement("o.input[4]");
    EXPECT_THAT(values("o.outputList[4].output"), ElementsAre(0, 1, 0, 0, 0, 1));
    EXPECT_THAT(indices("o.outputList"), ElementsAre(3, 4, 9));
}

TEST_F(OrthoAxis, AWriteThatFailsIsPassedOverAndAReadIsNot) {
    struct Row {
        FaultCase fault; // expected: of outputList[2]
        Values second;   // of outputList[7]
    };
    const Values axes{1, 0, 0, 0, 1, 0}, other{0, 1, 0, 0, 0, 1};
    const Row rows[] = {
        {{"HDataBlock::inputArrayValue", 1, false, {}}, {}},     {{"HArrayDataHandle::inputValue", 1, false, {}}, {}},
        {{"HArrayDataHandle::inputValue", 2, false, axes}, {}},  {{"HDataBlock::outputArrayValue", 1, true, {}}, other},
        {{"HArrayDataHandle::builder", 2, true, {}}, other}, // the inner one
        {{"HArrayDataBuilder::addElement", 1, true, {}}, other}, {{"HArrayDataBuilder::addElement", 9, true, axes}, {}},
        {{"HDataHandle::childArray", 1, true, {}}, other},       {{"HDataHandle::set", 6, true, {}}, other},
        {{"HArrayDataHandle::set", 2, true, {}}, other}, // the outer one
    };
    for (const auto& [fault, second] : rows) {
        SCOPED_TRACE(std::string(fault.operation) + ' ' + std::to_string(fault.call));
        run("file -new; createNode orthoAxisFromMatrixArray -name o; setAttr o.input[2]" + doubled +
            "setAttr o.input[7]" + sheared);
        evaluateWith(fault, "o.outputList");
        EXPECT_EQ(written(2), fault.expected);
        EXPECT_EQ(written(7), second);
    }
}

} // namespace
