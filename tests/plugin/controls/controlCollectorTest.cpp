// SPDX-License-Identifier: Apache-2.0
#include "plugin/controls/ControlsTest.h"

#include "support/TemporaryFolder.h"

namespace {

using OpenQuarn::computeCount;
using ::testing::ElementsAre;
using ::testing::IsEmpty;

class ControlCollector : public ControlsTest {
protected:
    ControlCollector() { collector = testNodes::create("controlCollector", "c"); }

    HObject collector;
};

TEST_F(ControlCollector, ShrinksGrowsAndKeepsItsValuesWithoutLists) {
    run("setAttr c.inputList[0].input 1 2 3; setAttr c.inputList[2].input 5");
    EXPECT_EQ(values("c.output"), (Values{1, 2, 3, 5}));
    run("setAttr c.inputList[1].input[2000000000] 4"); // between them
    EXPECT_EQ(values("c.output"), (Values{1, 2, 3, 4, 5}));
    removeElement("c.inputList[2]");
    removeElement("c.inputList[1].input[2000000000]"); // the list stays, and is empty
    EXPECT_EQ(values("c.output"), (Values{1, 2, 3}));
    EXPECT_THAT(indices("c.output"), ElementsAre(0, 1, 2));
    removeElement("c.inputList[0]");
    removeElement("c.inputList[1]");
    EXPECT_EQ(values("c.output"), (Values{1, 2, 3}));
    EXPECT_EQ(computeCount(collector), 4U);
}

TEST_F(ControlCollector, DropsElementsThatSomebodyAskedForBeyondTheLast) {
    run("setAttr c.inputList[0].input 1 2 3; connectAttr c.output[9] c.activationRate");
    EXPECT_EQ(values("c.output"), (Values{1, 2, 3}));
    EXPECT_FALSE(testNodes::plug("c.activationRate").isConnected());
    testNodes::plug("c.output[5]").asDouble(); // makes it
    run("setAttr c.inputList[0].input 4");
    EXPECT_EQ(values("c.output"), (Values{4, 2, 3}));
    EXPECT_THAT(indices("c.output"), ElementsAre(0, 1, 2));
}

TEST_F(ControlCollector, LimitsAndSamplingAffectNothingAndAreSaved) {
    run("setAttr c.inputList[0].input 1 2");
    values("c.output");
    const OpenQuarn::DirtyWatch dirty;
    run("setAttr c.limitsList[2].limits[1].minValue -3; setAttr c.limitsList[2].limits[1].maxValue 3;"
        "setAttr c.limitsList[2].limits[1].defaultValue 0.5;"
        "setAttr c.samples 0; setAttr c.activationRate 7; setAttr c.samplesStartFrame -20");
    EXPECT_THAT(dirty.plugs(), IsEmpty());
    EXPECT_EQ(computeCount(collector), 1U);

    const TemporaryFolder folder;
    const std::string file = OpenQuarn::quotedWord((folder.path() / "scene.json").string());
    run("file -saveAs " + file + "; file -new; file -open " + file);
    EXPECT_EQ(testNodes::plug("c.limitsList[2].limits[1].minValue").asDouble(), -3.0);
    EXPECT_EQ(testNodes::plug("c.limitsList[2].limits[1].maxValue").asDouble(), 3.0);
    EXPECT_EQ(testNodes::plug("c.limitsList[2].limits[1].defaultValue").asDouble(), 0.5);
    EXPECT_EQ(testNodes::plug("c.samples").asInt(), 1);
    EXPECT_EQ(testNodes::plug("c.activationRate").asDouble(), 1.0);
    EXPECT_EQ(testNodes::plug("c.samplesStartFrame").asInt(), -20);
    EXPECT_EQ(values("c.output"), (Values{1, 2}));
}

TEST_F(ControlCollector, DisconnectingAListEmptiesItAndAnElementGoesAlone) {
    run("createNode testSum -name s; setAttr s.values 1 2 3; setAttr c.inputList[1].input 7 8 9;"
        "connectAttr s.values c.inputList[4].input; connectAttr -force s.values[0] c.inputList[1].input[1]");
    EXPECT_EQ(values("c.output"), (Values{7, 1, 9, 1, 2, 3}));

    run("disconnectAttr s.values[0] c.inputList[1].input[1]");
    EXPECT_THAT(indices("c.inputList[1].input"), ElementsAre(0, 2));
    EXPECT_EQ(values("c.output"), (Values{7, 9, 1, 2, 3}));

    run("disconnectAttr s.values c.inputList[4].input");
    EXPECT_THAT(indices("c.inputList[4].input"), IsEmpty());
    EXPECT_EQ(values("c.output"), (Values{7, 9}));

    // as the source of a connection a list stays what it is
    run("connectAttr c.inputList[1].input s.values; disconnectAttr c.inputList[1].input s.values");
    EXPECT_THAT(indices("c.inputList[1].input"), ElementsAre(0, 2));
    // and so does one whose elements another node listens to
    run("connectAttr s.values c.inputList[5].input; connectAttr c.inputList[5].input[0] s.scale");
    values("c.output");
    run("disconnectAttr s.values c.inputList[5].input");
    EXPECT_THAT(indices("c.inputList[5].input"), ElementsAre(0));
}

TEST_F(ControlCollector, StopsWhereAHostCallFails) {
    const Values before(7, 9.0);
    const Values written{1, 2, 3, 4, 5, 9, 9};
    const FaultCase cases[] = {
        {"HDataBlock::inputArrayValue", 1, false, before},
        {"HArrayDataHandle::inputValue", 1, false, before}, // a list
        {"HArrayDataHandle::inputValue", 2, true, {4, 5}},  // a value: its list ends
        {"HArrayDataHandle::inputValue", 4, true, {1, 2, 4, 5}},
        {"HArrayDataHandle::inputValue", 5, false, before},
        {"HDataHandle::childArray", 2, false, before},
        {"HArrayDataHandle::next", 1, true, {1, 4, 5}},
        {"HArrayDataHandle::next", 3, false, before},
        {"HDataBlock::outputArrayValue", 1, false, before},
        {"HArrayDataHandle::builder", 1, true, before},
        {"HArrayDataBuilder::addElement", 3, true, {1, 2, 9, 9, 9, 9, 9}},
        {"HDataHandle::set", 2, true, {1, 9, 9, 9, 9, 9, 9}},
        {"HArrayDataBuilder::removeElement", 2, true, written},
        {"HArrayDataHandle::set", 1, true, written},
        {"HArrayDataHandle::setAllClean", 1, true, {1, 2, 3, 4, 5}},
    };
    for (const FaultCase& fault : cases) {
        SCOPED_TRACE(std::string(fault.operation) + ' ' + std::to_string(fault.call));
        run("file -new; createNode controlCollector -name c; setAttr c.inputList[2].input 9 9 9 9 9 9 9");
        EXPECT_EQ(values("c.output"), before);
        removeElement("c.inputList[2]");
        run("setAttr c.inputList[0].input 1 2 3; setAttr c.inputList[1].input 4 5");
        evaluateWith(fault, "c.output");
        EXPECT_EQ(values("c.output"), fault.expected);
    }
}

} // namespace
