// SPDX-License-Identifier: Apache-2.0
#include "quarn/character/trialProcess.h"

#include <fcntl.h>
#include <sys/resource.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <csignal>
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

[[noreturn]] void runAndEnd(const std::function<void()>& action) {
    keepQuiet();
    try {
        action();
    } catch (...) {
        // the same is thrown, and told, where it counts
        _exit(0);
    }
    _exit(0);
}

int statusOf(pid_t process) {
    int status = 0;
    while (waitpid(process, &status, 0) < 0)
        if (errno != EINTR)
            throw std::runtime_error("cannot wait for the process that tries the file: " +
                                     std::generic_category().message(errno));
    return status;
}

} // namespace

void runTrial(const std::function<void()>& action) {
    const pid_t process = fork();
    if (process < 0)
        throw std::runtime_error("cannot start a process that tries the file: " +
                                 std::generic_category().message(errno));
    if (process == 0)
        runAndEnd(action);
    const int status = statusOf(process);
    if (WIFSIGNALED(status) && (WTERMSIG(status) == SIGXCPU || WTERMSIG(status) == SIGKILL))
        throw std::runtime_error("reading the file takes more than " + std::to_string(mostSeconds) +
                                 " seconds, or more memory than there is");
    if (!WIFEXITED(status) || WEXITSTATUS(status) != 0)
        throw std::runtime_error("the file is damaged: the importer does not survive it");
}

} // namespace quarn
