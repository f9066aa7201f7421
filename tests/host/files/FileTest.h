// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "host/files/fileNodes.h"
#include "host/support/SceneTest.h"

#include "openquarn_app/Plugins.h"
#include "openquarn_app/SceneFile.h"

/// A test with an open session, the types of scene file tests, and no message that it did not expect.
class FileTest : public SceneTest {
protected:
    FileTest() { fileNodes::registerTypes(); }

    /// What was shown since the last call, without its severity.
    std::vector<std::string> takeMessages() {
        std::vector<std::string> texts = SceneTest::takeMessages();
        for (std::string& text : texts)
            text.erase(0, text.find(": ") + 2);
        return texts;
    }

    std::string saved() {
        std::string text;
        EXPECT_TRUE(OpenQuarn::sceneToText(text));
        return text;
    }

    /// Reads a scene; its warnings, or its error alone.
    std::vector<std::string> read(const std::string& text) {
        const OpenQuarn::FileOutcome outcome = OpenQuarn::sceneFromText(text, "file");
        EXPECT_EQ(outcome.ok, outcome.error.empty());
        EXPECT_EQ(takeMessages(), outcome.warnings) << "the sink gets the warnings; the error is the caller's to show";
        return outcome.ok ? outcome.warnings : std::vector<std::string>{outcome.error};
    }
};
