// SPDX-License-Identifier: Apache-2.0
// What killed writers leave, and what is no business of the next one.
#include "libraries/storage/StorageTest.h"

#include "storage/TemporaryFile.h"
#include "storage/WholeFile.h"

#include <csignal>
#include <cstring>
#include <random>

#include <fcntl.h>
#include <sched.h>
#include <sys/wait.h>

namespace {

namespace fs = std::filesystem;
using storage::WholeFile;
using storage::writeWhole;
using ::testing::AnyOf;
using ::testing::ElementsAre;

class KilledWriterTest : public StorageTest {
protected:
    /// In a child of this process; `inNewPids` says whether it is number 1 of a PID name space of its own. -1, with
    /// errno, where it could not be had.
    template <class Work>
    static pid_t inChild(Work work, bool inNewPids = false) {
        if (!inNewPids) {
            const pid_t child = ::fork();
            if (child == 0) {
                work();
                ::_exit(0);
            }
            return child;
        }
        const pid_t child = ::fork();
        if (child == 0) {
            if (::unshare(CLONE_NEWPID) != 0)
                ::_exit(77);
            const pid_t inner = inChild(work);
            int status = 0;
            ::waitpid(inner, &status, 0);
            ::_exit(WIFEXITED(status) ? WEXITSTATUS(status) : 1);
        }
        return child;
    }
    static int ended(pid_t child) {
        int status = -1;
        ::waitpid(child, &status, 0);
        return status;
    }
};

// at any moment, publishing and making the folder included; the system works on meanwhile
TEST_F(KilledWriterTest, IsSweptAwayByTheNextOneAndTheFileIsWhole) {
    const std::string one(100'000, '1'), two(100'000, '2');
    writeWhole(path("file"), one);
    std::mt19937 random(13);
    for (int kill = 0; kill < 60; ++kill) {
        const pid_t child = inChild([&] {
            for (;;)
                for (const std::string& text : {one, two})
                    writeWhole(path("file"), text);
        });
        ::usleep(static_cast<useconds_t>(random() % 4000));
        ::kill(child, SIGKILL);
        ended(child);
        ASSERT_THAT(content("file"), AnyOf(one, two));
    }
    // one that surely left something, and beside it what is not the next one's
    const pid_t child = inChild([&] {
        WholeFile file(path("file"));
        ::raise(SIGKILL);
    });
    ended(child);
    std::vector<std::string> left = names();
    ASSERT_GE(left.size(), 2U);
    for (const std::string& name : left)
        EXPECT_TRUE(name == "file" || storage::TemporaryFile::isOf(name, "file")) << name;
    std::string foreign = left.front();
    foreign[foreign.size() - 8] ^= 1; // the mark of another boot
    put(foreign, "of another machine");
    ended(inChild([&] {
        WholeFile file(path("other"));
        ::raise(SIGKILL);
    }));
    writeWhole(path("file"), one);
    EXPECT_EQ(names().size(), 3U) << "the file, another machine's, another file's";
    EXPECT_EQ(content(foreign), "of another machine");
    fs::remove(path(foreign));
    writeWhole(path("other"), two);
    EXPECT_THAT(names(), ElementsAre("file", "other"));
}

TEST_F(KilledWriterTest, ALivingWriterKeepsItsFileAlsoInAnotherPidNameSpace) {
    for (const bool inNewPids : {false, true}) {
        SCOPED_TRACE(inNewPids);
        int ready[2] = {}, go[2] = {};
        ASSERT_EQ(::pipe2(ready, O_CLOEXEC) | ::pipe2(go, O_CLOEXEC), 0);
        const pid_t child = inChild(
            [&] {
                char signal = 0;
                WholeFile file(path("file"));
                file.stream() << "theirs";
                file.stream().flush();
                if (::write(ready[1], "r", 1) != 1 || ::read(go[0], &signal, 1) != 1)
                    ::_exit(1);
                file.finish();
            },
            inNewPids);
        ::close(ready[1]);
        char signal = 0;
        if (::read(ready[0], &signal, 1) != 1) {
            EXPECT_EQ(WEXITSTATUS(ended(child)), 77);
            GTEST_SKIP() << "a PID name space of its own was refused";
        }
        writeWhole(path("file"), "ours");
        EXPECT_EQ(names().size(), 2U);
        EXPECT_EQ(content("file"), "ours");
        EXPECT_EQ(::write(go[1], "g", 1), 1);
        EXPECT_EQ(ended(child), 0);
        EXPECT_EQ(content("file"), "theirs");
        EXPECT_THAT(names(), ElementsAre("file"));
        for (const int open : {ready[0], go[0], go[1]})
            ::close(open);
    }
}

TEST_F(KilledWriterTest, WritersOfTheSameFileDoNotDisturbEachOther) {
    std::vector<std::thread> threads;
    std::vector<std::string> errors(8);
    for (std::size_t i = 0; i < errors.size(); ++i)
        threads.emplace_back([&, i] {
            errors[i] = failureOf([&] {
                for (int time = 0; time < 50; ++time)
                    writeWhole(path("file"), std::string(10'000, static_cast<char>('a' + i)));
            });
        });
    for (std::thread& thread : threads)
        thread.join();
    EXPECT_THAT(errors, ::testing::Each(""));
    EXPECT_EQ(content("file"), std::string(10'000, content("file").at(0)));
    EXPECT_THAT(names(), ElementsAre("file"));
}

} // namespace
