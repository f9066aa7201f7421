// SPDX-License-Identifier: Apache-2.0
#include "host/support/SceneTest.h"
#include "host/support/testDeformers.h"

#include "quarn/render/Panel.h"
#include "quarn/scene/plugs.h"
#include "quarn/scene/shownMeshes.h"

#include <array>
#include <limits>

namespace {

using namespace quarn;
using ::testing::HasSubstr;
using ::testing::ThrowsMessage;

class PanelTest : public SceneTest {
protected:
    // a mesh node of one triangle and further vertices that nobody uses
    static void addMesh(const std::string& name, const std::vector<double>& xyz) {
        MeshPolygons polygons;
        polygons.vertexCount = xyz.size() / 3;
        polygons.sizes = {3};
        polygons.corners = {0, 1, 2};
        HPlug plug = plugOf(createNode("mesh", name), "inMesh");
        ASSERT_FALSE(plug.setHObject(meshData(xyz, polygons)).error());
    }
};

TEST_F(PanelTest, LabelsAndPlugsAreTakenApart) {
    addMesh("a", {0, 0, 0, 1, 0, 0, -1e9, 1, 0});
    addMesh("b", {3, 4, 0, 1, 0, 0, -1e9, 1, 0.25});
    const Panel plain = panelFrom("error = 0=a.outMesh");
    EXPECT_EQ(plain.label, "error = 0");
    EXPECT_FALSE(plain.isHeat());
    const Panel heat = heatPanelFrom("a: to b=a.outMesh:b.outMesh");
    EXPECT_EQ(heat.label, "a: to b");
    EXPECT_EQ(evaluatePanel(heat, 1).at(0).distances, (std::vector<double>{5.0, 0.0, 0.25}));
    EXPECT_EQ(evaluatePanel(panelFrom("x=b.outMesh+a.outMesh"), 1).at(1).points[6], -1e9);
    const PanelFrame part = evaluatePanel(heatPanelFrom("x=a.outMesh:b.outMesh+b.outMesh"), 1);
    EXPECT_EQ(part.at(0).distances.size(), 3U);
    EXPECT_TRUE(part.at(1).distances.empty());
    for (const char* text : {"a.outMesh", "label=", ""})
        EXPECT_THAT([&] { panelFrom(text); }, ThrowsMessage<std::runtime_error>(HasSubstr("write LABEL=PLUG")));
    for (const char* text :
         {"x=a.outMesh", "x=a.outMesh:", "x=:a.outMesh", "x=a.outMesh:b.outMesh:a.outMesh", "x=a.outMesh+b.outMesh"})
        EXPECT_THAT([&] { heatPanelFrom(text); },
                    ThrowsMessage<std::runtime_error>(HasSubstr("write LABEL=PLUG:PLUG")));
    EXPECT_THAT([] { panelFrom("x=a.outMesh+c.outMesh"); },
                ThrowsMessage<std::runtime_error>(HasSubstr("there is no plug c.outMesh")));
}

TEST_F(PanelTest, WhatDoesNotFitIsRefusedByName) {
    addMesh("a", {0, 0, 0, 1, 0, 0, 0, 1, 0});
    addMesh("more", {0, 0, 0, 1, 0, 0, 0, 1, 0, 5, 5, 5});
    addMesh("broken", {0, 0, 0, 1, 0, 0, 0, std::numeric_limits<double>::quiet_NaN(), 0});
    EXPECT_THAT([] { evaluatePanel(heatPanelFrom("x=a.outMesh:more.outMesh"), 1); },
                ThrowsMessage<std::runtime_error>("the distance of a.outMesh from more.outMesh cannot be shown: "
                                                  "they have 3 and 4 vertices"));
    const std::string problem = "broken.outMesh cannot be drawn at frame 12: its vertex 2 has a position that is no "
                                "number";
    EXPECT_THAT([] { evaluatePanel(panelFrom("x=broken.outMesh"), 12); }, ThrowsMessage<std::runtime_error>(problem));
    EXPECT_THAT([] { evaluatePanel(heatPanelFrom("x=a.outMesh:broken.outMesh"), 12); },
                ThrowsMessage<std::runtime_error>(problem));
    EXPECT_THAT(
        [] {
            requireDrawable(std::vector<double>{0, 0, 1e200}, "p", -3);
        },
        ThrowsMessage<std::runtime_error>("p cannot be drawn at frame -3: its vertex 0 is too far away"));
}

TEST_F(PanelTest, ACharacterIsWhatItsLastDeformersGive) {
    testDeformers::registerTypes();
    for (const char* name : {"body", "target", "eyes", "lone"})
        addMesh(name, {0, 0, 0, 1, 0, 0, 0, 1, 0});
    for (const char* name : {"skin", "warp"})
        createNode("testDeformer", name);
    const std::array<std::array<const char*, 2>, 5> connections = {
        {{"body.outMesh", "skin.input[3].inputGeometry"},
         {"body.outMesh", "warp.originalGeometry[2]"},
         {"skin.outputGeom[3]", "warp.input[2].inputGeometry"},
         {"target.outMesh", "warp.originalGeometry[4]"},
         {"eyes.outMesh", "skin.input[1].inputGeometry"}}};
    for (const auto& [source, destination] : connections)
        connect(findPlug(source), findPlug(destination));
    std::vector<std::string> names;
    for (const HPlug& mesh : shownMeshes())
        names.emplace_back(mesh.name().asChar());
    EXPECT_THAT(names, ::testing::ElementsAre("warp.outputGeom[2]", "skin.outputGeom[1]", "lone.outMesh"));
}

} // namespace
