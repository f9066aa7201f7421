// SPDX-License-Identifier: Apache-2.0
// A test with an open session, the test node types, and no message that it did not expect.
#pragma once

#include "host/support/testNodes.h"

#include "openquarn_app/Faults.h"
#include "openquarn_app/Messages.h"
#include "openquarn_app/Session.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <string>
#include <utility>
#include <vector>

class SceneTest : public ::testing::Test {
protected:
    SceneTest() {
        previous_ = OpenQuarn::setMessageSink([this](const OpenQuarn::Message& message) {
            messages_.push_back(std::string(severityName(message.severity)) + ": " + message.text);
        });
        testNodes::Hooks::reset();
        testNodes::registerTypes();
    }

public:
    ~SceneTest() override {
        EXPECT_THAT(messages_, ::testing::IsEmpty());
        OpenQuarn::Faults::clear();
        OpenQuarn::setMessageSink(std::move(previous_));
    }

    OpenQuarn::Session session;

protected:
    /// What was shown since the last call, as "severity: text".
    std::vector<std::string> takeMessages() { return std::exchange(messages_, {}); }

private:
    std::vector<std::string> messages_;
    OpenQuarn::MessageSink previous_;
};
