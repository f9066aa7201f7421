// SPDX-License-Identifier: Apache-2.0
// From the text of a script to commands of words (openquarn_app/Commands.h says how it is written), and back.
#pragma once

#include <stdexcept>
#include <string>
#include <string_view>
#include <vector>

namespace OpenQuarn {

struct ScriptWord {
    std::string text;
    bool quoted = false; // began with a quote, and is no flag therefore
};

struct ScriptCommand {
    int line = 1;                  // of its first word
    std::vector<ScriptWord> words; // at least one
};

/// What is wrong with a text, and where.
class ScriptError : public std::runtime_error {
public:
    ScriptError(int line, const std::string& text)
        : std::runtime_error(text)
        , line_(line) {}
    int line() const { return line_; }

private:
    int line_;
};

/// All commands of the text. Throws ScriptError.
std::vector<ScriptCommand> splitScript(std::string_view text);

/// The text as one word, in quotes where it needs them: splitScript() gives it back. It may have no control characters
/// but newline and tab.
std::string quoteScriptWord(std::string_view text);

} // namespace OpenQuarn
