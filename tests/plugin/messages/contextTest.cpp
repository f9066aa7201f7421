// SPDX-License-Identifier: Apache-2.0
// The gate as a node finds it: in an evaluation of the scene, and in one of another time.
#include "messages/displayErrorGated.h"

#include "openquarn/HFnAttribute.h"
#include "openquarn/HFnDependencyNode.h"
#include "openquarn/HFnPlugin.h"
#include "openquarn_app/Evaluation.h"
#include "openquarn_app/Messages.h"
#include "openquarn_app/Plugins.h"
#include "openquarn_app/Session.h"

#include <gmock/gmock.h>

#include <string>
#include <vector>

namespace {

/// Complains at each evaluation, and gives whether that was shown.
class Complaint : public HPxNode {
public:
    static HPxNode* create() { return new Complaint; }
    static HStatus initialize() {
        const HObject trigger = HFnNumericAttribute().create("trigger", "t", HFnNumericData::kInt);
        isShown() = HFnNumericAttribute().create("isShown", "is", HFnNumericData::kBoolean);
        addAttribute(trigger);
        addAttribute(isShown());
        return attributeAffects(trigger, isShown());
    }
    HStatus compute(const HPlug& plug, HDataBlock& block) override {
        HStatus status = block.outputValue(isShown()).set(neuralWarp::displayErrorGated("complaint"));
        return status.error() ? status : block.setClean(plug);
    }

private:
    static HObject& isShown() {
        static HObject attribute;
        return attribute;
    }
};

constexpr std::uint32_t complaintId = 0x00001234;

// NOLINTNEXTLINE(performance-unnecessary-value-param): the type of an entry point
HStatus initializeComplaint(HObject plugin) {
    return HFnPlugin(plugin).registerNode("complaint", complaintId, Complaint::create, Complaint::initialize);
}

// NOLINTNEXTLINE(performance-unnecessary-value-param): the type of an entry point
HStatus uninitializeComplaint(HObject plugin) {
    return HFnPlugin(plugin).deregisterNode(complaintId);
}

TEST(DisplayErrorGated, IsSilentInAnEvaluationOfAnotherTime) {
    OpenQuarn::Session session;
    OpenQuarn::addPlugin("complaints", initializeComplaint, uninitializeComplaint);
    HFnDependencyNode node;
    ASSERT_FALSE(node.create("complaint").isNull());
    const HPlug isShown = node.findPlug("isShown");
    std::vector<std::string> shown;
    OpenQuarn::setMessageSink([&](const OpenQuarn::Message& message) { shown.push_back(message.text); });

    OpenQuarn::EvaluationContext otherTime(5.0);
    HStatus status;
    EXPECT_FALSE(otherTime.evaluateAt(isShown, &status).asBool());
    EXPECT_FALSE(status.error()) << status.errorString().asChar();
    EXPECT_THAT(shown, testing::IsEmpty());
    EXPECT_EQ(OpenQuarn::computeCount(node.object()), 1U);

    EXPECT_TRUE(isShown.asBool());
    EXPECT_THAT(shown, testing::ElementsAre("complaint"));
    OpenQuarn::setMessageSink({});
}

} // namespace
