// SPDX-License-Identifier: Apache-2.0
// What a program that makes targets is told, and everything that it may do wrong.
#include "quarn/run/targetProgram.h"

#include "storage/NpyFile.h"
#include "storage/NpyWriter.h"
#include "storage/openToAppend.h"
#include "storage/readWholeFile.h"
#include "support/TemporaryFolder.h"
#include "support/failureOf.h"

#include <gmock/gmock.h>

#include <algorithm>
#include <fstream>
#include <limits>

namespace quarn {
namespace {

namespace fs = std::filesystem;
using testing::HasSubstr;

constexpr std::size_t vertices = 2, frames = 5;
constexpr int firstFrame = 3;

// what a script begins with: where it is to write, and the first and the last frame that it is asked for
constexpr const char* reading = "out=$(sed -n 's/.*\"write\": \"\\(.*\\)\".*/\\1/p' \"$0\")\n"
                                "asked=$(sed -n '/\"frames\"/,/]/s/^ *\\([0-9]*\\),\\{0,1\\}$/\\1/p' \"$0\")\n"
                                "first=${asked%%[!0-9]*}\n";

class TargetProgramTest : public testing::Test {
protected:
    TargetProgramTest() {
        request.mesh = "arm";
        request.vertices = vertices;
        request.firstFrame = firstFrame;
        request.lastFrame = firstFrame + static_cast<int>(frames) - 1;
        request.order = "scene";
        request.skin = "skin.npy";
        request.skeleton = "poses.glb";
        request.scene = "poses.json";
        fs::create_directories(folder.path() / "out");
        cache("all", firstFrame, frames);
        cache("other", firstFrame, frames, 3);
        cache("short", firstFrame, frames - 1);
        cache("nan", firstFrame, frames);
        std::fstream(folder.path() / "nan", std::ios::in | std::ios::out | std::ios::binary).seekp(-4, std::ios::end)
            << std::string("\0\0\xc0\x7f", 4);
        fs::copy_file(folder.path() / "all", folder.path() / "half");
        fs::resize_file(folder.path() / "half", fs::file_size(folder.path() / "half") - 5);
        for (int first : {3, 5, 7})
            cache("part" + std::to_string(first), first, first == 7 ? 1 : 2);
    }

    // coordinates are the number of their frame
    void cache(const std::string& name, int first, std::size_t count, std::size_t points = vertices) {
        storage::NpyWriter writer((folder.path() / name).string(), points);
        for (std::size_t i = 0; i < count; ++i)
            writer.append(std::vector<float>(3 * points, static_cast<float>(first) + static_cast<float>(i)));
        writer.finish();
    }
    std::string run(const std::string& script, const std::string& digest = "d") {
        Step step;
        step.words = {"/bin/sh", "-c", "cd " + folder.path().string() + "\n" + reading + script};
        step.outputs = {"out/targets.npy"};
        step.request = request;
        const storage::Descriptor log = storage::openToAppend(folder.path() / "log", "");
        return failureOf([&] {
            runTargetProgram(step, {folder.path(), log.number(), digest, std::chrono::milliseconds(100), {}});
        });
    }
    bool hasAll() const {
        const storage::NpyFile file((folder.path() / "out/targets.npy").string());
        std::vector<double> xyz(3 * vertices);
        bool isSame = file.frameCount() == frames;
        for (std::size_t i = 0; isSame && i < frames; ++i) {
            file.read(i, 0, xyz);
            isSame = std::count(xyz.begin(), xyz.end(), firstFrame + static_cast<double>(i)) == 3 * vertices;
        }
        return isSame;
    }
    std::string log() const { return storage::readWholeFile(folder.path() / "log", 1 << 20); }

    TemporaryFolder folder;
    TargetRequest request;
};

TEST_F(TargetProgramTest, GivesAllFramesInItsPlace) {
    EXPECT_EQ(run("cp all $out; echo said"), "");
    EXPECT_TRUE(hasAll());
    EXPECT_EQ(log(), "said\n");
    EXPECT_FALSE(fs::exists(folder.path() / "scratch"));
}

TEST_F(TargetProgramTest, IsFoundOutInWhateverItDoesWrong) {
    for (const auto& [script, sentence] :
         {std::pair("cp all $out; exit 4", "ended with status 4"), std::pair("kill -9 $$", "was ended by signal 9"),
          std::pair("cp all $out; exec sleep 1000", "takes more than 1 s, and was ended"),
          std::pair("true", "has not written the file that it was asked for"),
          std::pair("ln -s $PWD/all $out", "has not written the file"),
          std::pair("mkfifo $out", "has not written the file"), std::pair("cp half $out", "targets.npy"),
          std::pair("echo text >$out", "targets.npy"),
          std::pair("cp short $out", "an array of [4, 2, 3], and was asked for [5, 2, 3]"),
          std::pair("cp other $out", "an array of [5, 3, 3], and was asked for [5, 2, 3]"),
          std::pair("cp nan $out", "no finite number, of vertex 1 in frame 7")}) {
        request.timeout = std::string(script).find("sleep") == std::string::npos ? 0 : 1;
        EXPECT_THAT(run(script), HasSubstr(sentence)) << script;
        EXPECT_FALSE(fs::exists(folder.path() / "out/targets.npy")) << script;
        EXPECT_FALSE(fs::exists(folder.path() / "scratch")) << script;
    }
}

TEST_F(TargetProgramTest, IsAskedAgainOnlyForPartsThatAreMissing) {
    request.part = 2;
    EXPECT_THAT(run("echo $first; [ $first != 7 ] || exit 1; cp part$first $out"), HasSubstr("ended with status 1"));
    EXPECT_EQ(log(), "3\n5\n7\n");
    // one of them was cut short meanwhile
    fs::resize_file(folder.path() / "out/targets.npy.parts-d/5.npy", 100);
    EXPECT_EQ(run("echo $first; cp part$first $out"), "");
    EXPECT_EQ(log(), "3\n5\n7\n5\n7\n");
    EXPECT_TRUE(hasAll());
    EXPECT_EQ(std::distance(fs::directory_iterator(folder.path() / "out"), {}), 1);
}

// shapes that are there already go before those that are asked for, in parts or at once
TEST_F(TargetProgramTest, PutsWhatItGetsBehindWhatIsKnown) {
    cache("known", firstFrame, 2);
    request.known = "known";
    request.firstFrame = firstFrame + 2;
    cache("new", request.firstFrame, frames - 2);
    EXPECT_EQ(run("cp new $out"), "");
    EXPECT_TRUE(hasAll());
    fs::remove(folder.path() / "out/targets.npy");
    request.part = 2;
    EXPECT_EQ(run("echo $first; cp part$first $out"), "");
    EXPECT_EQ(log(), "5\n7\n");
    EXPECT_TRUE(hasAll());
}

TEST_F(TargetProgramTest, PartsOfAnotherRequestDoNotCount) {
    request.part = 2;
    run("[ $first != 7 ] || exit 1; cp part$first $out");
    EXPECT_EQ(run("echo $first; cp part$first $out", "e"), "");
    EXPECT_EQ(log(), "3\n5\n7\n");
}

TEST_F(TargetProgramTest, IsToldWhatThereIs) {
    EXPECT_EQ(textOf(request, "/run", 4, 2, "/run/scratch/targets.npy"), R"({
    "format": "neuralWarp target request",
    "version": 1,
    "mesh": "arm",
    "character": "",
    "skeleton": {
        "file": "/run/poses.glb",
        "format": "glb"
    },
    "scene": "/run/poses.json",
    "skin": {
        "file": "/run/skin.npy",
        "format": "npy <f4",
        "shape": [
            5,
            2,
            3
        ],
        "firstFrame": 3,
        "metersPerUnit": 1.0,
        "axes": "as in the character's file",
        "order": "scene",
        "rest": "/run/"
    },
    "frames": [
        4,
        5
    ],
    "write": "/run/scratch/targets.npy"
}
)");
}

} // namespace
} // namespace quarn
