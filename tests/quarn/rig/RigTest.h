// SPDX-License-Identifier: Apache-2.0
// A test with the rig nodes, worked by host commands.
#pragma once

#include "host/support/SceneTest.h"

#include "openquarn/HMatrix.h"
#include "openquarn_app/Commands.h"
#include "openquarn_app/Evaluation.h"
#include "openquarn_app/Plugins.h"
#include "openquarn_app/SceneFile.h"
#include "rig/registration.h"

#include <string>
#include <vector>

class RigTest : public SceneTest {
protected:
    RigTest() { OpenQuarn::addPlugin("quarnRig", rig::registerNodes, rig::deregisterNodes); }

    static OpenQuarn::CommandValue run(const std::string& script) {
        auto outcome = OpenQuarn::runScript(script, "test");
        EXPECT_TRUE(outcome.ok) << outcome.error;
        return outcome.result;
    }
    static double number(const std::string& plug) { return testNodes::plug(plug).asDouble(); }
    static HMatrix matrix(const std::string& plug) { return HFnMatrixData(testNodes::plug(plug).asHObject()).matrix(); }
    static void setList(const std::string& plug, const std::vector<double>& values) {
        EXPECT_EQ(testNodes::text(testNodes::plug(plug).setHObject(HFnDoubleArrayData().create(values))), "");
    }
    /// The plug fails to be computed, and the one message of it ends in `problem`.
    void expectFailure(const std::string& plug, const std::string& problem) {
        EXPECT_TRUE(OpenQuarn::evaluate(testNodes::plug(plug)).error()) << problem;
        EXPECT_THAT(takeMessages(), ::testing::ElementsAre("report: '" + plug + "' could not be computed: " + problem));
    }
    static void saveAndOpen() {
        std::string text;
        EXPECT_TRUE(OpenQuarn::sceneToText(text));
        EXPECT_TRUE(OpenQuarn::sceneFromText(text, "saved"));
    }
};
