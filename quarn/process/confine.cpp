// SPDX-License-Identifier: Apache-2.0
#include "quarn/process/confine.h"

#include <fcntl.h>
#include <sys/prctl.h>
#include <sys/resource.h>
#include <sys/syscall.h>
#include <unistd.h>

#if __has_include(<linux/landlock.h>)
#include <linux/landlock.h>
#endif

#include <array>
#include <csignal>
#include <cstdint>
#include <cstdlib>

namespace quarn {
namespace {

#if defined(__SANITIZE_ADDRESS__) || defined(__SANITIZE_THREAD__)
constexpr bool hasSanitizer = true; // they reserve terabytes of address space
#elif defined(__has_feature)
constexpr bool hasSanitizer = __has_feature(address_sanitizer) || __has_feature(thread_sanitizer);
#else
constexpr bool hasSanitizer = false;
#endif

void limit(decltype(RLIMIT_CORE) resource, rlim_t most) {
    const rlimit value{most, most};
    setrlimit(resource, &value);
}

void beQuiet() {
    const int nowhere = open("/dev/null", O_WRONLY | O_CLOEXEC);
    if (nowhere >= 0) {
        dup2(nowhere, STDOUT_FILENO);
        dup2(nowhere, STDERR_FILENO);
    }
    limit(RLIMIT_CORE, 0); // a crash is an answer
    for (const int crash : {SIGSEGV, SIGABRT, SIGBUS, SIGFPE, SIGILL})
        std::signal(crash, SIG_DFL);
}

// bytes of address space in use; 0 when nobody says
rlim_t addressSpace() {
    const int file = open("/proc/self/statm", O_RDONLY | O_CLOEXEC);
    std::array<char, 64> text{};
    const ssize_t count = file < 0 ? -1 : read(file, text.data(), text.size() - 1);
    if (file >= 0)
        close(file);
    return count <= 0 ? 0 : std::strtoull(text.data(), nullptr, 10) * static_cast<rlim_t>(sysconf(_SC_PAGESIZE));
}

// Whatever the process has open, or opens, it cannot write to a file...
void refuseWriting() {
    limit(RLIMIT_FSIZE, 0);
    std::signal(SIGXFSZ, SIG_IGN); // the write fails
}

// ... and where the kernel has Landlock it makes, moves and removes none either.
void refuseChanges() {
    if (prctl(PR_SET_NO_NEW_PRIVS, 1, 0, 0, 0) != 0)
        return;
#ifdef LANDLOCK_ACCESS_FS_MAKE_SYM
    constexpr std::uint64_t truncate = std::uint64_t{1} << 14U; // LANDLOCK_ACCESS_FS_TRUNCATE, of the third version
    const long version =
        syscall(SYS_landlock_create_ruleset, nullptr, 0, std::uint32_t{LANDLOCK_CREATE_RULESET_VERSION});
    landlock_ruleset_attr rules{};
    rules.handled_access_fs = LANDLOCK_ACCESS_FS_WRITE_FILE | LANDLOCK_ACCESS_FS_REMOVE_DIR |
                              LANDLOCK_ACCESS_FS_REMOVE_FILE | LANDLOCK_ACCESS_FS_MAKE_CHAR |
                              LANDLOCK_ACCESS_FS_MAKE_DIR | LANDLOCK_ACCESS_FS_MAKE_REG | LANDLOCK_ACCESS_FS_MAKE_SOCK |
                              LANDLOCK_ACCESS_FS_MAKE_FIFO | LANDLOCK_ACCESS_FS_MAKE_BLOCK |
                              LANDLOCK_ACCESS_FS_MAKE_SYM | (version >= 3 ? truncate : 0);
    const auto ruleset = static_cast<int>(
        syscall(SYS_landlock_create_ruleset, &rules, sizeof rules.handled_access_fs, 0)); // no rule: allowed nowhere
    if (ruleset < 0)
        return;
    syscall(SYS_landlock_restrict_self, ruleset, 0);
    close(ruleset);
#endif
}

} // namespace

// decision 0135
void confine(const ApartLimits& limits) {
    prctl(PR_SET_PDEATHSIG, SIGKILL);
    beQuiet();
    limit(RLIMIT_CPU, static_cast<rlim_t>(limits.processorTime.count()));
    if (const rlim_t now = addressSpace(); now != 0 && !hasSanitizer)
        limit(RLIMIT_AS, now + limits.memory);
    refuseWriting();
    refuseChanges();
}

} // namespace quarn
