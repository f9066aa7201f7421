// SPDX-License-Identifier: Apache-2.0
// What a process at a distance may do, and what becomes of it.
#include "quarn/process/runApart.h"

#include "quarn/console/interrupt.h"
#include "support/TemporaryFolder.h"

#include <gmock/gmock.h>

#include <csignal>
#include <cstdlib>
#include <fstream>
#include <new>

#include <fcntl.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <unistd.h>

namespace quarn {
namespace {

using testing::HasSubstr;
using Why = NoAnswer::Why;

#if defined(__has_feature)
constexpr bool hasSanitizer = __has_feature(address_sanitizer) || __has_feature(thread_sanitizer);
#else
constexpr bool hasSanitizer = false;
#endif

TEST(RunApart, GivesWhatTheActionGivesOrThrows) {
    EXPECT_EQ(runApart([] { return std::string(3000000, 'x'); }), std::string(3000000, 'x'));
    EXPECT_EQ(runApart([] { return std::string(); }), "");
    try {
        runApart([]() -> std::string { throw std::runtime_error("a reason"); });
        ADD_FAILURE() << "nothing is thrown";
    } catch (const NoAnswer& none) {
        ADD_FAILURE() << none.what();
    } catch (const std::runtime_error& error) {
        EXPECT_STREQ(error.what(), "a reason");
    }
}

TEST(RunApart, SurvivesWhatTheActionDoesNot) {
    const ApartLimits tight{std::chrono::seconds(60), std::chrono::seconds(60), std::uint64_t{64} << 20U};
    const ApartLimits lazy{tight.wallClock, std::chrono::seconds(1), tight.memory};
    const ApartLimits hasty{std::chrono::seconds(1), tight.processorTime, tight.memory};
    struct Row {
        std::function<std::string()> action;
        ApartLimits limits;
        Why why;
        const char* what;
    };
    const auto fill = [] { return std::to_string(std::string(std::size_t{200} << 20U, 'x').back()); };
    const Row rows[] = {
        {[]() -> std::string { std::abort(); }, tight, Why::crashed, "crashes"},
        {[]() -> std::string { std::_Exit(0); }, tight, Why::crashed, "crashes"},
        {[]() -> std::string {
             for (;;)
                 static_cast<void>(getppid());
         },
         lazy, Why::outOfTime, "more than 1 seconds of processor time"},
        {[]() -> std::string {
             for (;;)
                 pause();
         },
         hasty, Why::outOfTime, "more than 1 seconds"},
        {[] { return std::string(std::size_t{65} << 20U, 'x'); }, tight, Why::outOfMemory, "more than 64 MiB"},
        {[]() -> std::string { throw std::bad_alloc(); }, tight, Why::outOfMemory, "more than 64 MiB of memory"},
        {fill, tight, Why::outOfMemory, "more than 64 MiB of memory"},
    };
    for (const Row& row : rows) {
        if (&row == std::end(rows) - 1 && hasSanitizer)
            continue; // their address space is not limited
        try {
            runApart(row.action, row.limits);
            ADD_FAILURE() << "an answer instead of \"" << row.what << '"';
        } catch (const NoAnswer& none) {
            EXPECT_EQ(none.why(), row.why) << none.what();
            EXPECT_THAT(none.what(), HasSubstr(row.what));
        }
    }
}

TEST(RunApart, ChangesNoFile) {
    const TemporaryFolder folder;
    const std::string kept = folder.path() / "kept", open = folder.path() / "open", made = folder.path() / "made";
    for (const std::string& file : {kept, open})
        std::ofstream(file) << "before";
    const int descriptor = ::open(open.c_str(), O_WRONLY | O_CLOEXEC);
    const std::string done = runApart([&] {
        std::string text;
        const auto note = [&](const char* what, bool isDone) { text += isDone ? std::string(what) + " " : ""; };
        note("wrote", ::write(::open(kept.c_str(), O_WRONLY), "x", 1) == 1);
        note("wrote-inherited", ::write(descriptor, "x", 1) == 1);
        note("truncated", ::truncate(kept.c_str(), 0) == 0);
        note("moved", ::rename(kept.c_str(), made.c_str()) == 0);
        note("made", ::mkdir(made.c_str(), 0777) == 0);
        note("removed", ::unlink(kept.c_str()) == 0);
        return text;
    });
    close(descriptor);
    if (syscall(SYS_landlock_create_ruleset, nullptr, 0, 1U) >= 3)
        EXPECT_EQ(done, "");
    else // only writing can be refused without Landlock
        EXPECT_THAT(done, testing::Not(HasSubstr("wrote")));
}

TEST(RunApart, EndsWhenTheUserAsksForIt) {
    watchForInterrupt();
    EXPECT_THROW(runApart([]() -> std::string {
                     kill(getppid(), SIGINT);
                     for (;;)
                         pause();
                 }),
                 Interrupted);
}

} // namespace
} // namespace quarn
