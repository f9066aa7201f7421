// SPDX-License-Identifier: Apache-2.0
// Doing something with a foreign file where it can do no harm: a library that was not written for hostile files may
// crash, take all memory, never come back, or write where it should not.
#pragma once

#include <chrono>
#include <cstdint>
#include <functional>
#include <stdexcept>
#include <string>

namespace quarn {

struct ApartLimits {
    std::chrono::seconds wallClock{300};
    std::chrono::seconds processorTime{120};
    std::uint64_t memory = std::uint64_t{8} << 30U; ///< bytes of address space, beyond what the caller has already, and
                                                    ///< of the answer; address space is not limited under sanitizers
};

/// The action gave no answer. what() says what became of it: "takes more than 120 seconds of processor time".
class NoAnswer : public std::runtime_error {
public:
    enum class Why { crashed, outOfTime, outOfMemory };
    NoAnswer(Why why, const std::string& what)
        : std::runtime_error(what)
        , why_(why) {}
    Why why() const { return why_; }

private:
    Why why_;
};

/// Runs `action` in a copy of this process and gives what it returns. The copy prints nothing, writes into no file (and
/// makes, moves and removes none, where the kernel has Landlock), and changes nothing here; it ends when this one does.
/// Throws std::runtime_error with what `action` throws; NoAnswer when it crashes or goes beyond a limit; Interrupted
/// when the user asks for the end meanwhile; std::runtime_error when there can be no such process. The answer comes
/// from a process that may have been damaged: it is not to be trusted. `action` may only use what the calling thread
/// uses alone. Thread: any.
std::string runApart(const std::function<std::string()>& action, const ApartLimits& limits = {});

} // namespace quarn
