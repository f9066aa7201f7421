// SPDX-License-Identifier: Apache-2.0
// The program killed at any moment: the data set of the runs together is that of one run.
#include "quarn/dataset/ExportScene.h"

#include "quarn/dataset/DatasetFolder.h"
#include "quarn/dataset/DatasetWriter.h"
#include "storage/FolderLock.h"
#include "storage/WholeFile.h"

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
    ASSERT_EQ(expected.size(), 6U);

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

// as export --overwrite does it, without the frames
void replaceDataset(const fs::path& output, const std::string& value) {
    const quarn::DatasetFolder folder(output, true);
    quarn::Setup setup;
    setup.add("value", value);
    static_cast<void>(folder.isDone(setup));
    storage::FolderLock lock(folder.part(), quarn::anotherExport);
    quarn::DatasetWriter writer(folder.part(), {1, 1, 1});
    if (folder.begun(setup) == quarn::Begun::no || !writer.resume().empty()) {
        folder.begin(setup);
        writer.begin();
    }
    if (writer.rows() == 0) {
        const std::vector<float> numbers(3, std::stof(value));
        writer.append(1, std::span(numbers).first(1), numbers, std::span(numbers).first(1));
    }
    writer.save();
    storage::writeWhole(folder.part() / quarn::descriptionFile, value);
    folder.publish(lock);
}

// most of such a child's time goes into beginning and publishing
TEST_F(KillTest, ADataSetThatIsReplacedIsThereAtAnyMoment) {
    const fs::path parent = folder.path() / "data", output = parent / "set";
    fs::create_directory(parent);
    std::map<std::string, std::map<std::string, std::string>> whole;
    for (const char* value : {"1", "2"}) {
        replaceDataset(output, value);
        whole[value] = contentsOf(output);
        ASSERT_EQ(whole[value].size(), 6U);
    }
    std::mt19937 random(6);
    for (int kill = 0; kill < 60; ++kill) {
        const pid_t child = ::fork();
        if (child == 0)
            for (;;)
                for (const char* value : {"1", "2"})
                    replaceDataset(output, value);
        for (int look = 0; look < 20; ++look) {
            std::this_thread::sleep_for(std::chrono::microseconds(random() % 2000));
            ASSERT_TRUE(fs::exists(output)) << "there is a moment without a data set";
        }
        ::kill(child, SIGKILL);
        EXPECT_TRUE(WIFSIGNALED(ended(child)))
            << "it ended by itself: an earlier kill has left what it cannot go on from";
        auto found = contentsOf(output);
        const std::string value = found["dataset.json"];
        for (const auto& [name, bytes] : whole[value])
            ASSERT_EQ(found[name], bytes) << name;
    }
    replaceDataset(output, "1");
    EXPECT_EQ(contentsOf(output), whole["1"]);
    EXPECT_EQ(std::distance(fs::directory_iterator(parent), {}), 1) << "nothing is left beside it";
}

} // namespace
