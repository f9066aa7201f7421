// SPDX-License-Identifier: Apache-2.0
#include "shownMessages.h"

#include "messages/catalogue.h"

#include <algorithm>
#include <map>
#include <regex>
#include <string_view>

namespace replay {
namespace {

using OpenQuarn::Message;
using OpenQuarn::Severity;

// What a text of the catalogue looks like when it is shown: a group for each argument, numbered in order of appearance.
struct Pattern {
    explicit Pattern(std::string_view text) {
        std::string expression;
        for (std::size_t i = 0; i < text.size(); ++i) {
            if (text[i] == '^' && i + 2 < text.size() && text[i + 1] >= '1' && text[i + 1] <= '9' &&
                text[i + 2] == 's') {
                expression += placeholder(text[i + 1]);
                i += 2;
            } else {
                expression += escaped(text[i]);
            }
        }
        regex = std::regex(expression);
    }

    std::regex regex;
    std::map<char, std::size_t> groups; // by the digit of the placeholder, which is the order of the arguments

private:
    // a placeholder that occurs again stands for the same argument
    std::string placeholder(char digit) {
        const auto [group, isFirst] = groups.try_emplace(digit, groups.size() + 1);
        return isFirst ? "([\\s\\S]*?)" : "\\" + std::to_string(group->second);
    }
    static std::string escaped(char character) {
        constexpr std::string_view special = R"(^$\.*+?()[]{}|)";
        return special.find(character) == std::string_view::npos ? std::string(1, character)
                                                                 : std::string{'\\', character};
    }
};

const std::vector<Pattern>& patterns() {
    static const std::vector<Pattern> all = [] {
        std::vector<Pattern> made;
        made.reserve(neuralWarp::catalogue.size());
        for (const neuralWarp::CatalogueEntry& entry : neuralWarp::catalogue)
            made.emplace_back(entry.text);
        return made;
    }();
    return all;
}

std::string display(const Message& message, bool survivesPlayback) {
    if (message.severity == Severity::error)
        return survivesPlayback ? "command" : "gated";
    const std::string severity = severityName(message.severity);
    return survivesPlayback ? severity : "gated " + severity;
}

std::vector<std::string> described(const std::string& display, const std::string& text) {
    std::vector<std::string> parts = keyAndArguments(text);
    parts.insert(parts.begin(), display);
    return parts;
}

} // namespace

MessageCapture::MessageCapture()
    : previous_(OpenQuarn::setMessageSink([this](const Message& message) {
        if (message.severity != Severity::report)
            messages_.push_back(message);
    })) {}

MessageCapture::~MessageCapture() {
    OpenQuarn::setMessageSink(std::move(previous_));
}

std::vector<std::string> keyAndArguments(const std::string& shown) {
    for (std::size_t i = 0; i < patterns().size(); ++i) {
        const Pattern& pattern = patterns()[i];
        std::smatch match;
        if (!std::regex_match(shown, match, pattern.regex))
            continue;
        std::vector<std::string> parts{neuralWarp::catalogue[i].key};
        for (const auto& [digit, group] : pattern.groups)
            parts.push_back(match[group]);
        return parts;
    }
    return {"(not in the catalogue)", shown};
}

std::vector<std::vector<std::string>> describe(const std::vector<Message>& normal,
                                               const std::vector<Message>& whilePlaying) {
    std::vector<Message> rest = whilePlaying;
    std::vector<std::vector<std::string>> all;
    for (const Message& message : normal) {
        const auto twin = std::find_if(rest.begin(), rest.end(), [&](const Message& other) {
            return other.severity == message.severity && other.text == message.text;
        });
        all.push_back(described(display(message, twin != rest.end()), message.text));
        if (twin != rest.end())
            rest.erase(twin);
    }
    for (const Message& message : rest)
        all.push_back(described("playback", message.text));
    return all;
}

} // namespace replay
