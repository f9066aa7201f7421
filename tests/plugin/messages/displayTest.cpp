// SPDX-License-Identifier: Apache-2.0
// Which messages are shown, and when.
#include "messages/displayErrorGated.h"
#include "messages/messageText.h"

#include "openquarn/HGlobal.h"
#include "openquarn_app/Animation.h"
#include "openquarn_app/Messages.h"

#include <gmock/gmock.h>

#include <string>
#include <vector>

namespace {

using neuralWarp::displayErrorGated;
using neuralWarp::raiseMessage;
using neuralWarp::Text;
using OpenQuarn::Animation;
using testing::ElementsAre;
using testing::IsEmpty;

/// Collects the messages of one test.
class Messages : public testing::Test {
public:
    Messages() {
        OpenQuarn::setMessageSink([this](const OpenQuarn::Message& message) {
            shown.push_back(std::string(severityName(message.severity)) + ": " + message.text);
        });
    }
    ~Messages() override {
        Animation::setPlaying(false);
        Animation::setScrubbing(false);
        OpenQuarn::setMessageSink({});
    }

    std::vector<std::string> shown;
};

TEST_F(Messages, GatedErrorsAreShownOnlyWhileTheAnimationStands) {
    for (const bool isPlaying : {false, true})
        for (const bool isScrubbing : {false, true}) {
            Animation::setPlaying(isPlaying);
            Animation::setScrubbing(isScrubbing);
            shown.clear();
            const bool isShown = raiseMessage<Text::kErrorMLModelInvalid>(displayErrorGated, 2U);
            EXPECT_EQ(isShown, !isPlaying && !isScrubbing);
            if (isShown)
                EXPECT_THAT(shown, ElementsAre("error: [NEURAL WARP] The training of the ml model for index 2 does not "
                                               "match the connected geometry. It will need to be retrained."));
            else
                EXPECT_THAT(shown, IsEmpty());
        }
}

TEST_F(Messages, WarningsAreShownDuringPlayback) {
    Animation::setPlaying(true);
    raiseMessage<Text::kWarnMLMetaAffectCountMismatch>(HGlobal::displayWarning, HString("warp1"), 0U, 8U, 9U);
    EXPECT_THAT(shown, ElementsAre("warning: [NEURAL WARP \"warp1\", multiIndex 0] Affected vertex count of the "
                                   "deformer (8) does not match the affected vertex count of the trained model (9)"));
}

} // namespace
