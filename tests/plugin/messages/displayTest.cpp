// SPDX-License-Identifier: Apache-2.0
// Which messages are shown, and when.
#include "host/support/SceneTest.h"
#include "messages/displayErrorGated.h"
#include "messages/messageText.h"

#include "openquarn/HGlobal.h"
#include "openquarn_app/Animation.h"
#include "openquarn_app/Evaluation.h"

namespace {

using neuralWarp::displayErrorGated;
using neuralWarp::raiseMessage;
using neuralWarp::Text;
using OpenQuarn::Animation;
using testing::ElementsAre;
using testing::IsEmpty;

class Messages : public SceneTest {
public:
    ~Messages() override {
        Animation::setPlaying(false);
        Animation::setScrubbing(false);
    }
};

TEST_F(Messages, GatedErrorsAreShownOnlyWhileTheAnimationStands) {
    for (const bool isPlaying : {false, true})
        for (const bool isScrubbing : {false, true}) {
            Animation::setPlaying(isPlaying);
            Animation::setScrubbing(isScrubbing);
            const bool isShown = raiseMessage<Text::kErrorMLModelInvalid>(displayErrorGated, 2U);
            EXPECT_EQ(isShown, !isPlaying && !isScrubbing);
            if (isShown)
                EXPECT_THAT(takeMessages(), ElementsAre("error: [NEURAL WARP] The training of the ml model for index 2 "
                                                        "does not match the connected geometry. It will need to be "
                                                        "retrained."));
            else
                EXPECT_THAT(takeMessages(), IsEmpty());
        }
}

// the gate as a node finds it: in an evaluation of the scene, and in one of another time
TEST_F(Messages, GatedErrorsAreSilentInAnEvaluationOfAnotherTime) {
    testNodes::Hooks::compute = [](HPxNode&, const HPlug& plug, HDataBlock& block) {
        HStatus status = block.outputValue(plug).set(displayErrorGated("complaint") ? 1.0 : 0.0);
        return status.error() ? status : block.setClean(plug);
    };
    const HObject node = testNodes::create("testCase", "node");
    const HPlug isShown = testNodes::plug("node.out");
    OpenQuarn::EvaluationContext otherTime(5.0);
    HStatus status;
    EXPECT_EQ(otherTime.evaluateAt(isShown, &status).asDouble(), 0.0);
    EXPECT_EQ(testNodes::text(status), "");
    EXPECT_THAT(takeMessages(), IsEmpty());
    EXPECT_EQ(OpenQuarn::computeCount(node), 1U);

    EXPECT_EQ(isShown.asDouble(), 1.0);
    EXPECT_THAT(takeMessages(), ElementsAre("error: complaint"));
}

TEST_F(Messages, WarningsAreShownDuringPlayback) {
    Animation::setPlaying(true);
    raiseMessage<Text::kWarnMLMetaAffectCountMismatch>(HGlobal::displayWarning, HString("warp1"), 0U, 8U, 9U);
    EXPECT_THAT(takeMessages(),
                ElementsAre("warning: [NEURAL WARP \"warp1\", multiIndex 0] Affected vertex count of the deformer (8) "
                            "does not match the affected vertex count of the trained model (9)"));
}

} // namespace
