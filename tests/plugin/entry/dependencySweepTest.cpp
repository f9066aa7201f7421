// SPDX-License-Identifier: Apache-2.0
// Which attributes of the deformer have its geometry evaluated again: those that are named here, and no others.
#include "host/support/testDeformers.h"
#include "openquarn_app/Evaluation.h"
#include "openquarn_app/NodeTypes.h"
#include "plugin/entry/PluginTest.h"

#include <algorithm>
#include <map>
#include <set>

namespace {

using namespace testNodes;
using OpenQuarn::AttributeInfo;

constexpr const char* output = "warp.outputGeom[0]";

class DependencySweepTest : public PluginTest {
protected:
    DependencySweepTest() {
        for (AttributeInfo& info : OpenQuarn::attributesOf("neuralWarp")) {
            const std::string name = info.name;
            attributes.emplace(name, std::move(info));
        }
    }

    /// A grid goes into geometry 0 of the node "warp", which has been evaluated. "other" is a second deformer.
    void makeScene() {
        session.newScene();
        testDeformers::meshNode("grid", testDeformers::grid(4, 3));
        warp = create("neuralWarp", "warp");
        create("neuralWarp", "other");
        connect("grid.outMesh", "warp.input[0].inputGeometry");
        testDeformers::meshNode("rest", testDeformers::grid(4, 3));
        connect("rest.outMesh", "warp.originalGeometry[0]");
        EXPECT_EQ(text(plug("warp.models[0].modelActive").setInt(0)), "");
        for (const char* name : {output, "warp.export", "warp.train"})
            EXPECT_EQ(text(OpenQuarn::evaluate(plug(name))), "");
    }

    /// "NODE.train[0].epochs": in every array the first element.
    std::string path(const std::string& node, const std::string& attribute) const {
        const AttributeInfo& info = attributes.at(attribute);
        const std::string above = info.parent.empty() ? node : path(node, info.parent);
        return above + "." + attribute + (info.array ? "[0]" : "");
    }

    /// Gives the attribute of "warp" another value than it has by default; the second time, another one still.
    std::string change(const std::string& attribute, bool isSecond) const {
        const AttributeInfo& info = attributes.at(attribute);
        HPlug changed = plug(path("warp", attribute));
        if (attribute == "inputGeometry")
            changed = plug("grid.inMesh"); // connected: what comes in changes
        if (attribute == "originalGeometry")
            changed = plug("rest.inMesh");
        if (info.valueType == "mesh")
            return text(changed.setHObject(testDeformers::grid(4, 3, isSecond ? 2.0 : 1.0)));
        if (info.valueType == "string")
            return text(changed.setString(isSecond ? "second" : "first"));
        if (info.kind == HFn::kMessageAttribute || info.kind == HFn::kCompoundAttribute) {
            const bool isMessage = info.kind == HFn::kMessageAttribute;
            const std::string source = isMessage ? "other.message" : path("other", attribute);
            (isSecond ? disconnect : connect)(source, path("warp", attribute));
            return "";
        }
        return text(changed.setDouble(isSecond ? info.defaultNumber : otherNumber(info)));
    }

    static double otherNumber(const AttributeInfo& info) {
        if (info.max)
            return info.defaultNumber == *info.max ? *info.min : *info.max;
        return info.defaultNumber == 0.0 ? 1.0 : 0.0;
    }

    static bool has(const OpenQuarn::DirtyWatch& dirty, const std::string& name) {
        return std::find(dirty.plugs().begin(), dirty.plugs().end(), name) != dirty.plugs().end();
    }

    std::map<std::string, AttributeInfo> attributes;
    HObject warp;
};

// of the deformer's own, and of what the host's deformers have
const std::set<std::string> affecting = {"modelActive",
                                         "modelName",
                                         "models",
                                         "modelRoot",
                                         "controlValues",
                                         "targetMorphGeometry",
                                         "targetMorphEnabled",
                                         "targetMorphEnvelope",
                                         "input",
                                         "inputGeometry",
                                         "componentTagExpression",
                                         "originalGeometry",
                                         "envelope",
                                         "weightList",
                                         "weights"};

TEST_F(DependencySweepTest, OnlyWhatIsNamedHasTheGeometryEvaluatedAgain) {
    unsigned changes = 0;
    for (const auto& [name, info] : attributes) {
        if (!info.writable)
            continue; // an output: nobody changes it
        SCOPED_TRACE(name);
        makeScene();
        if (name == "input") { // connected as a whole it has no room for a connection below
            disconnect("grid.outMesh", "warp.input[0].inputGeometry");
            OpenQuarn::evaluate(plug(output));
        }
        const bool isExpected = affecting.count(name) != 0;
        for (const bool isSecond : {false, true}) { // the first change makes elements, the second finds them
            const OpenQuarn::DirtyWatch dirty;
            const unsigned before = OpenQuarn::computeCount(warp);
            EXPECT_EQ(change(name, isSecond), "");
            EXPECT_EQ(has(dirty, output) || has(dirty, "warp.outputGeom"), isExpected); // the element, or all of it
            OpenQuarn::evaluate(plug(output));
            EXPECT_EQ(OpenQuarn::computeCount(warp) - before, isExpected ? 1U : 0U);
            OpenQuarn::evaluate(plug(output));
            EXPECT_EQ(OpenQuarn::computeCount(warp) - before, isExpected ? 1U : 0U) << "clean, but computed again";
            ++changes;
        }
        takeMessages(); // a model that is on and is not there: not what this is about
    }
    EXPECT_GT(changes, 2U * 32U);
}

TEST_F(DependencySweepTest, AtItsDefaultsTheDeformerLeavesTheGeometryAsItIs) {
    makeScene();
    create("neuralWarp", "bare"); // without a rest shape, and nothing is set: that fails, and changes nothing either
    connect("grid.outMesh", "bare.input[0].inputGeometry");
    const std::vector<HPoint> in = testDeformers::points(plug("grid.outMesh"));
    ASSERT_EQ(in.size(), 12U);
    for (const std::string node : {"warp", "bare"})
        EXPECT_EQ(testDeformers::points(plug(node + ".outputGeom[0]")), in) << node;
    EXPECT_THAT(takeMessages(), ::testing::ElementsAre(::testing::HasSubstr("'bare.outputGeom[0]'")));
}

} // namespace
