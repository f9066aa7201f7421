// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "openquarn_app/Messages.h"

#include <string>
#include <utility>
#include <vector>

namespace replay {

// Collects what the host shows while it lives; reports of failed host calls are left out. One at a time.
class MessageCapture {
public:
    MessageCapture();
    ~MessageCapture();
    MessageCapture(const MessageCapture&) = delete;
    MessageCapture& operator=(const MessageCapture&) = delete;

    // What was shown since the last call.
    std::vector<OpenQuarn::Message> take() { return std::exchange(messages_, {}); }

private:
    std::vector<OpenQuarn::Message> messages_;
    OpenQuarn::MessageSink previous_;
};

// A shown text taken apart: the key of the one text of the catalogue that it is made from, then the arguments. For a
// text of another origin "(not in the catalogue)" and the text.
std::vector<std::string> keyAndArguments(const std::string& shown);

// The messages of one step as [display, key, arguments...], from two runs of it: `normal`, and `whilePlaying`, during
// playback. An error that playback suppresses is "gated", one that it does not "command". What is shown during playback
// alone comes last, as "playback".
std::vector<std::vector<std::string>> describe(const std::vector<OpenQuarn::Message>& normal,
                                               const std::vector<OpenQuarn::Message>& whilePlaying);

} // namespace replay
