// SPDX-License-Identifier: Apache-2.0
#include "scriptTarget.h"

#include "commands/ScriptText.h"
#include "require.h"

#include <algorithm>

namespace {

using namespace OpenQuarn;

std::string writtenAgain(const std::vector<ScriptCommand>& commands) {
    std::string text;
    for (const ScriptCommand& command : commands) {
        for (const ScriptWord& word : command.words)
            text += quoteScriptWord(word.text) + ' ';
        text += '\n';
    }
    return text;
}

void requireSame(const std::vector<ScriptCommand>& one, const std::vector<ScriptCommand>& other) {
    const auto sameWord = [](const ScriptWord& a, const ScriptWord& b) { return a.text == b.text; };
    const auto sameCommand = [&](const ScriptCommand& a, const ScriptCommand& b) {
        return std::equal(a.words.begin(), a.words.end(), b.words.begin(), b.words.end(), sameWord);
    };
    require(std::equal(one.begin(), one.end(), other.begin(), other.end(), sameCommand));
}

} // namespace

bool fuzzScript(const std::uint8_t* data, std::size_t size) {
    const std::string text(reinterpret_cast<const char*>(data), size);
    const auto lines = std::count(text.begin(), text.end(), '\n') + 1;
    try {
        const std::vector<ScriptCommand> commands = splitScript(text);
        for (const ScriptCommand& command : commands)
            require(!command.words.empty() && command.line >= 1 && command.line <= lines);
        requireSame(commands, splitScript(writtenAgain(commands)));
        return true;
    } catch (const ScriptError& error) {
        require(error.line() >= 1 && error.line() <= lines);
        return false;
    }
}
