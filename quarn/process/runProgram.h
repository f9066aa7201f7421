// SPDX-License-Identifier: Apache-2.0
// Starting a program, without a shell, and waiting for its end.
#pragma once

#include <chrono>
#include <filesystem>
#include <functional>
#include <map>
#include <optional>
#include <stdexcept>
#include <string>
#include <vector>

namespace quarn {

/// A program, and where what it says goes.
struct ProgramCall {
    std::vector<std::string> words;                 ///< the program, a path or a name of the PATH, and its arguments
    std::filesystem::path folder;                   ///< where it runs; empty for where this process is
    int log = -1;                                   ///< an open file of the caller, for its standard error
    int output = -1;                                ///< likewise, for its standard output; -1 for the log
    std::map<std::string, std::string> environment; ///< beside what this process has and is not its own (ownVariable.h)
    std::optional<std::chrono::seconds> timeout;
    std::chrono::milliseconds grace{10'000}; ///< between the request to end, and the end
};

/// It took longer than it was allowed to.
class TimedOut : public std::runtime_error {
public:
    using std::runtime_error::runtime_error;
};

/// How a program ended.
struct ProgramEnd {
    int status = 0; ///< its exit status, when `signal` is 0
    int signal = 0; ///< that ended it
    bool isGood() const { return status == 0 && signal == 0; }
    /// "ended with status 3", "was ended by signal 11 (Segmentation fault)"
    std::string text() const;
    /// Throws with that text unless the end is good: storage::LockedByAnother of one that says so with its status, 75;
    /// otherwise std::runtime_error. Throws Interrupted where this process was asked to end too.
    void require() const;
};

/// Runs a program to its end. Its standard input is empty; it is the first of a process group of its own, of which
/// nothing is left behind, whatever it has started, except what leaves the group. When the user asks for the end, or
/// the time is over, the group gets SIGTERM, and SIGKILL after `grace`: throws Interrupted, or TimedOut. When this
/// process ends by force the program gets SIGTERM. `meanwhile` is called at least every tenth of a second or so. Throws
/// std::runtime_error, naming the program, when it cannot be started. Thread: main.
ProgramEnd runProgram(const ProgramCall& call, const std::function<void()>& meanwhile = {});

} // namespace quarn
