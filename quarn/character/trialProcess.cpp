// SPDX-License-Identifier: Apache-2.0
#include "quarn/character/trialProcess.h"

#include <fcntl.h>
#include <sys/resource.h>
#include <sys/wait.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <csignal>
#include <new>
#include <stdexcept>
#include <string>
#include <system_error>

namespace quarn {
namespace {

constexpr rlim_t mostSeconds = 120;

// a crash here is an answer: it should leave neither words nor a core file
void keepQuiet() {
    const rlimit noCore{0, 0};
    const rlimit time{mostSeconds, mostSeconds};
    setrlimit(RLIMIT_CORE, &noCore);
    setrlimit(RLIMIT_CPU, &time);
    const int nowhere = open("/dev/null", O_WRONLY | O_CLOEXEC);
    if (nowhere >= 0) {
        dup2(nowhere, STDOUT_FILENO);
        dup2(nowhere, STDERR_FILENO);
    }
    for (const int crash : {SIGSEGV, SIGABRT, SIGBUS, SIGFPE, SIGILL})
        std::signal(crash, SIG_DFL);
}

// the first byte of an answer
constexpr char returned = 'r';
constexpr char threw = 't';
constexpr char outOfMemory = 'm';

std::string answerOf(const std::function<std::string()>& action) {
    try {
        return returned + action();
    } catch (const std::bad_alloc&) {
        return {outOfMemory};
    } catch (const std::exception& error) {
        return threw + std::string(error.what());
    }
}

[[noreturn]] void runAndEnd(const std::function<std::string()>& action, int pipe) {
    keepQuiet();
    int status = 1;
    try {
        const std::string answer = answerOf(action);
        std::size_t sent = 0;
        while (sent < answer.size()) {
            const ssize_t now = write(pipe, answer.data() + sent, answer.size() - sent);
            if (now < 0 && errno != EINTR)
                _exit(1);
            sent += now > 0 ? static_cast<std::size_t>(now) : 0;
        }
        status = 0;
    } catch (...) {
        status = 1; // nothing was sent that counts
    }
    _exit(status);
}

// both ends of a pipe; closed with their owner
class Pipe {
public:
    Pipe() {
        if (pipe2(ends_.data(), O_CLOEXEC) != 0)
            throw std::runtime_error("cannot make a pipe to the process that tries the file: " +
                                     std::generic_category().message(errno));
    }
    ~Pipe() {
        close(ends_[0]);
        closeWriting();
    }
    Pipe(const Pipe&) = delete;
    Pipe& operator=(const Pipe&) = delete;

    int writing() const { return ends_[1]; }
    void closeWriting() {
        if (ends_[1] >= 0)
            close(ends_[1]);
        ends_[1] = -1;
    }
    /// All that comes until the other side is gone.
    std::string readAll() const {
        std::string bytes;
        std::array<char, 65536> piece{};
        for (;;) {
            const ssize_t count = read(ends_[0], piece.data(), piece.size());
            if (count == 0 || (count < 0 && errno != EINTR))
                return bytes;
            bytes.append(piece.data(), count > 0 ? static_cast<std::size_t>(count) : 0);
        }
    }

private:
    std::array<int, 2> ends_{-1, -1};
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
                throw std::runtime_error("cannot wait for the process that tries the file: " +
                                         std::generic_category().message(errno));
        process_ = 0;
        return status;
    }

private:
    pid_t process_;
};

void checkStatus(int status) {
    if (WIFSIGNALED(status) && (WTERMSIG(status) == SIGXCPU || WTERMSIG(status) == SIGKILL))
        throw std::runtime_error("reading the file takes more than " + std::to_string(mostSeconds) +
                                 " seconds, or more memory than there is");
    if (!WIFEXITED(status) || WEXITSTATUS(status) != 0)
        throw std::runtime_error("the file is damaged: the importer does not survive it");
}

} // namespace

std::string runTrial(const std::function<std::string()>& action) {
    Pipe pipe;
    const pid_t process = fork();
    if (process < 0)
        throw std::runtime_error("cannot start a process that tries the file: " +
                                 std::generic_category().message(errno));
    if (process == 0)
        runAndEnd(action, pipe.writing());
    Child child(process);
    pipe.closeWriting();
    std::string answer = pipe.readAll();
    checkStatus(child.waitForStatus());
    const char kind = answer.empty() ? '\0' : answer.front();
    if (kind == outOfMemory)
        throw std::bad_alloc();
    if (kind != returned && kind != threw)
        throw std::runtime_error("the file is damaged: the importer does not survive it");
    answer.erase(0, 1);
    if (kind == threw)
        throw std::runtime_error(answer);
    return answer;
}

} // namespace quarn
