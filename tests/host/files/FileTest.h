// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "host/files/fileNodes.h"

#include "openquarn_app/Messages.h"
#include "openquarn_app/Plugins.h"
#include "openquarn_app/SceneFile.h"
#include "openquarn_app/Session.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

/// A test with an open session, the types of scene file tests, and no message that it did not expect.
class FileTest : public ::testing::Test {
protected:
    FileTest() {
        previous_ =
            OpenQuarn::setMessageSink([this](const OpenQuarn::Message& message) { messages_.push_back(message.text); });
        fileNodes::registerTypes();
    }

public:
    ~FileTest() override {
        EXPECT_THAT(messages_, ::testing::IsEmpty());
        OpenQuarn::setMessageSink(std::move(previous_));
    }

protected:
    std::vector<std::string> takeMessages() { return std::exchange(messages_, {}); }

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

    OpenQuarn::Session session;

private:
    std::vector<std::string> messages_;
    OpenQuarn::MessageSink previous_;
};
