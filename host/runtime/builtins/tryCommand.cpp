// SPDX-License-Identifier: Apache-2.0
// try: a command that is expected not to work.
#include "builtins/builtins.h"
#include "commands/CommandRegistry.h"
#include "commands/Results.h"
#include "commands/WordValues.h"
#include "commands/dispatch.h"
#include "core/Object.h"
#include "messages/ShownErrors.h"

#include <stdexcept>

namespace OpenQuarn {
namespace {

std::vector<ScriptWord> wordsOf(const HArgList& args) {
    std::vector<ScriptWord> words;
    for (const auto& word : Access::impl(args))
        words.push_back({word.text.asStdString(), word.quoted});
    return words;
}

// has no syntax: the words are the other command's, flags and all
class Try : public HPxCommand {
    HStatus doIt(const HArgList& args) override {
        const std::vector<ScriptWord> words = wordsOf(args);
        if (words.empty())
            return {HStatus::kFailure, "the command to be tried is missing"};
        ShownErrors shown;
        CommandValue unused;
        const HStatus status = dispatch(words, unused);
        std::string error = status.error() ? status.errorString().asStdString() : shown.first();
        if (error.empty())
            return {HStatus::kFailure, "no error came of " + inQuotes(words.front().text)};
        shown.forget();
        *RunningResult::current() = std::move(error);
        return {};
    }
};

} // namespace

void addTryCommand(CommandRegistry& registry) {
    const HStatus status = registry.add({"try",
                                         [] { return new Try; },
                                         {},
                                         nullptr,
                                         "Runs a command that has to fail, or to show an error, and gives its text."});
    if (status.error())
        throw std::logic_error(status.errorString().asChar());
}

} // namespace OpenQuarn
