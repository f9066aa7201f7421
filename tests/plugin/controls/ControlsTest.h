// SPDX-License-Identifier: Apache-2.0
// A test with the control nodes, worked by host commands.
#pragma once

#include "host/support/SceneTest.h"
#include "openquarn/HDGModifier.h"
#include "openquarn_app/Commands.h"
#include "openquarn_app/Evaluation.h"
#include "plugin/controls/controlNodesPlugin.h"

#include <string>
#include <string_view>
#include <vector>

using Values = std::vector<double>;
using Indices = std::vector<unsigned>;

/// What a node makes of a host call that fails.
struct FaultCase {
    const char* operation;
    int call;
    bool ok;         ///< the status of the compute
    Values expected; ///< of the output, afterwards
};

class ControlsTest : public SceneTest {
protected:
    ControlsTest() { addControlNodes(); }

    static OpenQuarn::CommandValue run(const std::string& script) {
        const auto outcome = OpenQuarn::runScript(script, "test");
        EXPECT_TRUE(outcome.ok) << outcome.error;
        return outcome.result;
    }

    /// Logical indices of the elements of an array.
    static Indices indices(const std::string& array) {
        Indices existing;
        EXPECT_EQ(testNodes::text(testNodes::plug(array).getExistingArrayAttributeIndices(existing)), "");
        return existing;
    }

    /// The elements of an array, evaluated, or as they are where that fails.
    static Values values(const std::string& array) {
        const HPlug plug = testNodes::plug(array);
        OpenQuarn::evaluate(plug);
        Values elements;
        for (const unsigned index : indices(array))
            elements.push_back(plug.elementByLogicalIndex(index).asDouble());
        return elements;
    }

    static void removeElement(const std::string& element) {
        HDGModifier modifier;
        EXPECT_EQ(testNodes::text(modifier.removeMultiInstance(testNodes::plug(element), true)), "");
        EXPECT_EQ(testNodes::text(modifier.doIt()), "");
    }

    /// Evaluates with the fault. A failure is reported by the host, and by nobody else; a success is not.
    void evaluateWith(const FaultCase& fault, const std::string& plug) {
        OpenQuarn::Faults::fail(fault.operation, fault.call);
        EXPECT_EQ(!OpenQuarn::evaluate(testNodes::plug(plug)).error(), fault.ok);
        EXPECT_TRUE(OpenQuarn::Faults::fired(fault.operation));
        OpenQuarn::Faults::clear();
        EXPECT_THAT(takeMessages(), ::testing::SizeIs(fault.ok ? 0 : 1));
    }
};
