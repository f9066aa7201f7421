// SPDX-License-Identifier: Apache-2.0
#include "quarn/process/runApart.h"

#include "quarn/console/interrupt.h"
#include "quarn/process/confine.h"
#include "storage/Descriptor.h"

#include <fcntl.h>
#include <sys/poll.h>
#include <sys/wait.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <csignal>
#include <new>
#include <system_error>

namespace quarn {
namespace {

using Clock = std::chrono::steady_clock;
using Why = NoAnswer::Why;

// the first byte of an answer
constexpr char returned = 'r';
constexpr char threw = 't';
constexpr char hadNoMemory = 'm';

std::string answerOf(const std::function<std::string()>& action) {
    try {
        return returned + action();
    } catch (const std::bad_alloc&) {
        return {hadNoMemory};
    } catch (const std::exception& error) {
        return threw + std::string(error.what());
    }
}

[[noreturn]] void runAndEnd(const std::function<std::string()>& action, const ApartLimits& limits, int pipe) {
    confine(limits);
    int status = 1;
    try {
        const std::string answer = answerOf(action);
        status = storage::writeAll(pipe, std::as_bytes(std::span(answer))) == 0 ? 0 : 1;
    } catch (...) {
        status = 1; // nothing was sent that counts
    }
    _exit(status);
}

[[noreturn]] void failToStart(const char* what) {
    throw std::runtime_error(std::string("cannot ") + what +
                             " a process that works at a distance: " + std::generic_category().message(errno));
}

[[noreturn]] void runOutOfMemory(const ApartLimits& limits) {
    throw NoAnswer(Why::outOfMemory, "takes more than " + std::to_string(limits.memory >> 20U) + " MiB of memory");
}

class Pipe {
public:
    Pipe() {
        std::array<int, 2> ends{};
        if (pipe2(ends.data(), O_CLOEXEC) != 0)
            failToStart("make a pipe to");
        reading_ = storage::Descriptor(ends[0]);
        writing_ = storage::Descriptor(ends[1]);
    }

    int writing() const { return writing_.number(); }
    void closeWriting() { writing_.close(); }
    /// All that comes until the other side is gone.
    std::string readAll(const ApartLimits& limits) const {
        const Clock::time_point end = Clock::now() + limits.wallClock;
        std::string bytes;
        std::array<char, 65536> piece{};
        for (;;) {
            waitForBytes(limits, end);
            const ssize_t count = read(reading_.number(), piece.data(), piece.size());
            if (count == 0 || (count < 0 && errno != EINTR))
                return bytes;
            bytes.append(piece.data(), count > 0 ? static_cast<std::size_t>(count) : 0);
            if (bytes.size() > limits.memory)
                runOutOfMemory(limits);
        }
    }

private:
    void waitForBytes(const ApartLimits& limits, Clock::time_point end) const {
        constexpr int milliseconds = 100;
        pollfd side{reading_.number(), POLLIN, 0};
        while (poll(&side, 1, milliseconds) <= 0) {
            throwIfInterrupted();
            if (Clock::now() > end)
                throw NoAnswer(Why::outOfTime,
                               "takes more than " + std::to_string(limits.wallClock.count()) + " seconds");
        }
    }

    storage::Descriptor reading_, writing_;
};

// a process, which does not stay behind
class Child {
public:
    explicit Child(pid_t process)
        : process_(process) {}
    ~Child() {
        if (process_ <= 0)
            return;
        kill(process_, SIGKILL);
        waitpid(process_, nullptr, 0);
    }
    Child(const Child&) = delete;
    Child& operator=(const Child&) = delete;

    int waitForStatus() {
        int status = 0;
        while (waitpid(process_, &status, 0) < 0)
            if (errno != EINTR)
                failToStart("wait for");
        process_ = 0;
        return status;
    }

private:
    pid_t process_;
};

void checkStatus(int status, const ApartLimits& limits) {
    const int signal = WIFSIGNALED(status) ? WTERMSIG(status) : 0;
    if (signal == SIGXCPU || signal == SIGKILL)
        throw NoAnswer(Why::outOfTime, "takes more than " + std::to_string(limits.processorTime.count()) +
                                           " seconds of processor time, or more memory than there is");
    if (!WIFEXITED(status) || WEXITSTATUS(status) != 0)
        throw NoAnswer(Why::crashed, "crashes");
}

} // namespace

std::string runApart(const std::function<std::string()>& action, const ApartLimits& limits) {
    Pipe pipe;
    const pid_t process = fork();
    if (process < 0)
        failToStart("start");
    if (process == 0)
        runAndEnd(action, limits, pipe.writing());
    Child child(process);
    pipe.closeWriting();
    std::string answer = pipe.readAll(limits);
    checkStatus(child.waitForStatus(), limits);
    const char kind = answer.empty() ? '\0' : answer.front();
    if (kind == hadNoMemory)
        runOutOfMemory(limits);
    if (kind != returned && kind != threw)
        throw NoAnswer(Why::crashed, "crashes");
    answer.erase(0, 1);
    if (kind == threw)
        throw std::runtime_error(answer);
    return answer;
}

} // namespace quarn
