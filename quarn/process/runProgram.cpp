// SPDX-License-Identifier: Apache-2.0
#include "quarn/process/runProgram.h"

#include "quarn/console/exitCodes.h"
#include "quarn/console/interrupt.h"
#include "quarn/process/ownVariable.h"
#include "storage/Descriptor.h"
#include "storage/FileError.h"
#include "storage/LockedByAnother.h"

#include <fcntl.h>
#include <sys/prctl.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <csignal>
#include <cstring>
#include <thread>

namespace quarn {
namespace {

namespace fs = std::filesystem;
using Clock = std::chrono::steady_clock;
using storage::Descriptor;

// pointers to texts, with the null that ends them
std::vector<char*> pointersTo(std::vector<std::string>& texts) {
    std::vector<char*> pointers;
    pointers.reserve(texts.size() + 1);
    for (std::string& text : texts)
        pointers.push_back(text.data());
    pointers.push_back(nullptr);
    return pointers;
}

std::vector<std::string> environmentOf(const ProgramCall& call) {
    std::vector<std::string> texts;
    for (char** entry = environ; *entry != nullptr; ++entry) {
        const std::string text = *entry, name = text.substr(0, text.find('='));
        if (call.environment.count(name) == 0 && !isOwnVariable(name))
            texts.push_back(text);
    }
    for (const auto& [name, value] : call.environment)
        texts.push_back(std::string(name).append("=").append(value));
    return texts;
}

/// All that the child needs, made before there is one: it then takes no memory.
struct Start {
    explicit Start(const ProgramCall& call)
        : words(call.words)
        , environment(environmentOf(call))
        , argv(pointersTo(words))
        , envp(pointersTo(environment))
        , folder(call.folder)
        , input(::open("/dev/null", O_RDONLY | O_CLOEXEC))
        , log(call.log)
        , output(call.output < 0 ? call.log : call.output) {
        std::array<int, 2> ends{};
        if (pipe2(ends.data(), O_CLOEXEC) != 0)
            throw std::runtime_error("no pipe to a program could be made: " + storage::textOfErrno(errno));
        failure = Descriptor(ends[0]);
        tellFailure = Descriptor(ends[1]);
    }

    std::vector<std::string> words, environment;
    std::vector<char*> argv, envp;
    fs::path folder;
    Descriptor input;
    int log, output;
    Descriptor failure, tellFailure; ///< closed by a start that goes well; else an errno comes
    pid_t parent = getpid();
};

[[noreturn]] void become(const Start& start) {
    setpgid(0, 0);
    prctl(PR_SET_PDEATHSIG, SIGTERM);
    for (const int signal : {SIGINT, SIGTERM, SIGPIPE, SIGHUP, SIGQUIT})
        std::signal(signal, SIG_DFL);
    const bool isReady = getppid() == start.parent && dup2(start.input.number(), STDIN_FILENO) >= 0 &&
                         dup2(start.output, STDOUT_FILENO) >= 0 && dup2(start.log, STDERR_FILENO) >= 0 &&
                         (start.folder.empty() || chdir(start.folder.c_str()) == 0);
    if (isReady)
        execvpe(start.argv[0], start.argv.data(), start.envp.data());
    const int error = errno;
    static_cast<void>(::write(start.tellFailure.number(), &error, sizeof error) < 0);
    _exit(127);
}

/// The first process of a group, and those that it has started.
class Group {
public:
    explicit Group(pid_t leader)
        : leader_(leader) {
        setpgid(leader, leader); // whoever of the two comes first
    }
    ~Group() {
        if (leader_ > 0)
            finish();
    }
    Group(const Group&) = delete;
    Group& operator=(const Group&) = delete;

    /// It is still to be waited for then, and its number not another's.
    bool hasEnded() const {
        siginfo_t info{};
        return waitid(P_PID, static_cast<id_t>(leader_), &info, WEXITED | WNOHANG | WNOWAIT) == 0 &&
               info.si_pid == leader_;
    }
    void tell(int signal) const { ::kill(-leader_, signal); }
    ProgramEnd finish() {
        tell(SIGKILL);
        int status = 0;
        while (waitpid(leader_, &status, 0) < 0 && errno == EINTR) {
        }
        leader_ = 0;
        return WIFSIGNALED(status) ? ProgramEnd{0, WTERMSIG(status)} : ProgramEnd{WEXITSTATUS(status), 0};
    }

private:
    pid_t leader_;
};

// until it has ended, the time has come, or `stop` says so
template <class Stop>
void waitFor(const Group& group, Clock::time_point until, const Stop& stop) {
    constexpr std::chrono::milliseconds longest{50};
    for (std::chrono::milliseconds pause{1}; !group.hasEnded() && Clock::now() < until && !stop();
         pause = std::min(2 * pause, longest))
        std::this_thread::sleep_for(pause);
}

void requireStarted(Start& start, const ProgramCall& call) {
    start.tellFailure.close();
    int error = 0;
    ssize_t count = 0;
    while ((count = ::read(start.failure.number(), &error, sizeof error)) < 0 && errno == EINTR) {
    }
    if (count > 0)
        throw std::runtime_error(call.words.front() + " could not be started: " + storage::textOfErrno(error));
}

} // namespace

std::string ProgramEnd::text() const {
    if (signal == 0)
        return "ended with status " + std::to_string(status);
    return "was ended by signal " + std::to_string(signal) + " (" + strsignal(signal) + ")"; // NOLINT: main thread
}

void ProgramEnd::require() const {
    if (isGood())
        return;
    throwIfInterrupted();
    if (signal == 0 && status == exitCode::locked)
        throw storage::LockedByAnother(text());
    throw std::runtime_error(text());
}

ProgramEnd runProgram(const ProgramCall& call, const std::function<void()>& meanwhile) {
    throwIfInterrupted();
    Start start(call);
    const pid_t process = fork();
    if (process < 0)
        throw std::runtime_error(call.words.front() + " could not be started: " + storage::textOfErrno(errno));
    if (process == 0)
        become(start);
    Group group(process);
    requireStarted(start, call);
    const Clock::time_point end = call.timeout ? Clock::now() + *call.timeout : Clock::time_point::max();
    waitFor(group, end, [&] {
        if (meanwhile)
            meanwhile();
        return isInterrupted();
    });
    if (group.hasEnded())
        return group.finish();
    const bool isLate = !isInterrupted();
    group.tell(SIGTERM);
    waitFor(group, Clock::now() + call.grace, [] { return false; });
    group.finish();
    if (isLate)
        throw TimedOut("takes more than " + std::to_string(call.timeout->count()) + " s");
    throw Interrupted();
}

} // namespace quarn
