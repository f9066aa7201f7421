// SPDX-License-Identifier: Apache-2.0
// A scene with one or more test deformers, and what is asked of them over and over.
#pragma once

#include "host/support/SceneTest.h"
#include "host/support/testDeformers.h"

#include "openquarn/HFnDependencyNode.h"
#include "openquarn_app/Evaluation.h"

class FilterTest : public SceneTest {
protected:
    FilterTest() { testDeformers::registerTypes(); }

    static HPxDeformerNode& deformer(const std::string& name) {
        return dynamic_cast<HPxDeformerNode&>(*HFnDependencyNode(testNodes::plug(name + ".message").node()).userNode());
    }
    static std::string input(const std::string& node, unsigned index) {
        return node + ".input[" + std::to_string(index) + "].inputGeometry";
    }
    static std::string output(const std::string& node, unsigned index) {
        return node + ".outputGeom[" + std::to_string(index) + "]";
    }
    static void set(const std::string& plug, const HObject& data) {
        EXPECT_EQ(testNodes::text(testNodes::plug(plug).setHObject(data)), "");
    }
    static std::string evaluate(const std::string& plug) {
        return testNodes::text(OpenQuarn::evaluate(testNodes::plug(plug)));
    }
    static std::vector<unsigned> outputs(const std::string& node) {
        std::vector<unsigned> indices;
        testNodes::plug(node + ".outputGeom").getExistingArrayAttributeIndices(indices);
        return indices;
    }
    static std::vector<double> pushed(const std::string& plug, const HObject& from) {
        return testDeformers::pushed(testNodes::plug(plug), from);
    }
};
