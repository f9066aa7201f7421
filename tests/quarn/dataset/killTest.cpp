// SPDX-License-Identifier: Apache-2.0
// The program killed at any moment: the data set of the runs together is that of one run.
#include "quarn/dataset/ExportScene.h"

#include <chrono>
#include <csignal>
#include <random>
#include <thread>

#include <fcntl.h>
#include <sys/wait.h>
#include <unistd.h>

namespace {

namespace fs = std::filesystem;
using namespace std::chrono_literals;

constexpr std::size_t frames = 1500;

class KillTest : public ExportScene {
protected:
    pid_t start(const fs::path& output) const {
        const std::string scenePath = scene();
        const pid_t child = ::fork();
        if (child == 0) {
            ::dup2(::open("/dev/null", O_WRONLY), STDOUT_FILENO);
            ::execl(NW_QUARN, "quarn", "export", scenePath.c_str(), "-o", output.c_str(), "-q", "--threads", "1",
                    static_cast<char*>(nullptr));
            ::_exit(127);
        }
        return child;
    }
    static int ended(pid_t child) {
        int status = -1;
        ::waitpid(child, &status, 0);
        return status;
    }
};

// half of the kills come at any time; half as soon as a seeded number of records was written, surely in the middle
TEST_F(KillTest, ResumesToTheSameBytes) {
    writeTarget(frames);
    save(frames);
    const fs::path whole = folder.path() / "whole", output = folder.path() / "killed";
    ASSERT_EQ(ended(start(whole)), 0);
    const auto expected = contentsOf(whole);
    ASSERT_EQ(expected.size(), 5U);

    std::mt19937 random(20);
    for (int kill = 0; kill < 20; ++kill) {
        const pid_t child = start(output);
        if (kill % 2 == 0)
            std::this_thread::sleep_for(std::chrono::milliseconds(random() % 300));
        const std::string before = contentOf(output.string() + ".part/progress.json");
        for (int wait = 0; wait < 500 && kill % 2 == 1 && !fs::exists(output); ++wait) {
            if (contentOf(output.string() + ".part/progress.json") != before)
                break;
            std::this_thread::sleep_for(1ms);
        }
        ::kill(child, SIGKILL);
        ended(child);
        if (fs::exists(output / "dataset.json")) { // it was done before: the next one begins anew
            ASSERT_EQ(ended(start(output)), 0);
            ASSERT_EQ(contentsOf(output), expected);
            fs::remove_all(output);
        }
    }
    ASSERT_EQ(ended(start(output)), 0);
    EXPECT_EQ(contentsOf(output), expected);
    EXPECT_FALSE(fs::exists(output.string() + ".part"));
}

} // namespace
