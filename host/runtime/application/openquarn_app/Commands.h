// SPDX-License-Identifier: Apache-2.0
// Commands and scripts, run by an application.
//
// A script is text. Commands end at the end of the line or at ";"; a "\" before the end of the line continues the
// command on the next. Words are separated by blanks; "..." keeps blanks and knows \" \\ \n and \t, '...' keeps
// everything as it is; neither goes over the end of a line. "#" and "//" at the beginning of a word start a comment
// that ends with the line. docs/commands.md lists the commands.
#pragma once

#include "openquarn/HStatus.h"

#include <functional>
#include <string>
#include <string_view>
#include <variant>
#include <vector>

class HPxCommand;
class HSyntax;

namespace OpenQuarn {

/// A result: none, a boolean, a whole number, a number, a text, or an array.
using CommandValue = std::variant<std::monostate, bool, int, long long, double, std::string, std::vector<int>,
                                  std::vector<double>, std::vector<std::string>>;

/// A value as a person reads it: numbers in the fewest digits that read back the same, booleans as "true" and "false",
/// arrays of numbers separated by blanks, arrays of texts one a line, nothing for no result. Thread: any.
OPENQUARN_API std::string printedValue(const CommandValue& value);

/// The text as one word of a script, quoted where it has to be. Thread: any.
OPENQUARN_API std::string quotedWord(std::string_view text);

struct CommandOutcome {
    bool ok = true;
    /// Of a failure: "COMMAND: what is wrong"; for scripts preceded by "NAME, line LINE: ".
    std::string error;
    /// Of the last command that ran; none after a failure.
    CommandValue result;
    /// The first error or report (Messages.h) that a command showed which did not fail, as "COMMAND: TEXT", with the
    /// same before it; empty without one. The mesh of a deformer that cannot be evaluated is a mesh all the same.
    std::string shownError;
    explicit operator bool() const { return ok; }
};

/// Called with each command's result as soon as it has one that is not none.
using ResultSink = std::function<void(const CommandValue&)>;

/// What becomes of a script when a command shows an error and does not fail.
enum class OnShownError {
    goOn, ///< It is in `shownError` afterwards.
    stop, ///< It is in `shownError`, and nothing runs after it.
};

/// Runs a text of one command, or several that end at the first that fails. Nothing is thrown. Thread: main.
OPENQUARN_API CommandOutcome runCommand(std::string_view text) noexcept;

/// Runs a script up to the first command that fails; one that is not well-formed is refused before any of it runs.
/// `name` what errors call it. Nothing is thrown, unless `results` throws. Thread: main.
OPENQUARN_API CommandOutcome runScript(std::string_view text, std::string_view name, const ResultSink& results = {},
                                       OnShownError onShownError = OnShownError::goOn);

/// Reads the file and runs it; errors call it by its path. Thread: main.
OPENQUARN_API CommandOutcome runScriptFile(const std::string& path, const ResultSink& results = {},
                                           OnShownError onShownError = OnShownError::goOn);

/// Adds a command of the application's own; plug-ins register theirs with HFnPlugin.
/// `name` a letter, then letters, digits and underscores; `create` gives a new object for the host to delete, or null;
/// `syntax` is called once, now; may be empty. Fails with kInvalidParameter for another name, without a creator, and
/// when there is a command of that name; with kFailure when `syntax` throws. Thread: main.
OPENQUARN_API HStatus addCommand(const std::string& name, std::function<HPxCommand*()> create,
                                 const std::function<HSyntax()>& syntax = {});

/// Takes such a command away. Fails with kFailure when there is none of that name, when it is the host's or a
/// plug-in's, and while it runs. Thread: main.
OPENQUARN_API HStatus removeCommand(const std::string& name);

/// Names of all commands, in alphabetical order. Thread: main.
OPENQUARN_API std::vector<std::string> commandNames();

} // namespace OpenQuarn
