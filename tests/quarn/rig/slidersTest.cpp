// SPDX-License-Identifier: Apache-2.0
// Sliders, and the grid that their shapes may move.
#include "host/support/testDeformers.h"
#include "quarn/rig/RigTest.h"

#include "openquarn/HFnMesh.h"

namespace {

class Sliders : public RigTest {};

TEST_F(Sliders, OutputHasOneElementForEachSlider) {
    run("createNode sliders -name face; createNode joint -name head; connectAttr face.output[9] head.translateX;"
        "setAttr face.slider[5].value 0.5; setAttr face.slider[2].value -3; setAttr face.slider[7].sliderName blink;"
        "setAttr face.slider[2].minValue -1; setAttr face.slider[7].defaultValue 0.25");
    EXPECT_EQ(OpenQuarn::printedValue(run("getAttr face.output")), "-3 0.5 0"); // ranges and defaults are for others
    EXPECT_EQ(OpenQuarn::printedValue(run("getAttr -multiIndices face.output")), "2 5 7");
    EXPECT_EQ(OpenQuarn::printedValue(run("listConnections head")), ""); // of an element that is no slider's
    run("connectAttr head.rotateX face.slider[5].value; setAttr head.rotateX 2");
    EXPECT_EQ(OpenQuarn::printedValue(run("getAttr face.output[5]")), "2");
    saveAndOpen();
    EXPECT_EQ(OpenQuarn::printedValue(run("getAttr face.output")), "-3 2 0");
}

TEST_F(Sliders, AGridIsRowsOfVerticesThatFaceUp) {
    run("createNode polyGrid -name g; setAttr g.width 4; setAttr g.depth 2;"
        "setAttr g.subdivisionsWidth 2; setAttr g.subdivisionsDepth 1");
    EXPECT_EQ(testDeformers::points(testNodes::plug("g.outMesh")),
              (std::vector<HPoint>{{-2, 0, -1}, {0, 0, -1}, {2, 0, -1}, {-2, 0, 1}, {0, 0, 1}, {2, 0, 1}}));
    HIntArray corners;
    EXPECT_FALSE(HFnMesh(testNodes::plug("g.outMesh").asHObject()).getPolygonVertices(1, corners).error());
    EXPECT_THAT(std::vector<int>(corners.begin(), corners.end()), ::testing::ElementsAre(1, 4, 5, 2));

    // a number that comes by a connection knows no limits
    run("createNode joint -name j; connectAttr j.translateX g.width; connectAttr j.translateY g.subdivisionsDepth;"
        "setAttr j.translateY 1");
    const struct {
        const char *script, *problem;
    } rows[] = {
        {"setAttr j.translateX -1", "width is -1, not a finite number from 0 on"},
        {"setAttr j.translateX 1; setAttr j.translateY 0", "subdivisionsDepth is 0, not 1 or more"},
        {"setAttr j.translateY 2147483647", "subdivisionsWidth 2 and subdivisionsDepth 2147483647 make more than "
                                            "1048576 vertices"},
        {"setAttr j.translateY 1023; setAttr g.subdivisionsWidth 1024",
         "subdivisionsWidth 1024 and subdivisionsDepth 1023 make more than 1048576 vertices"},
    };
    for (const auto& row : rows) {
        run(row.script);
        expectFailure("g.outMesh", row.problem);
    }
}

} // namespace
