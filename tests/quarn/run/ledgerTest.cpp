// SPDX-License-Identifier: Apache-2.0
// When a step is done again, and what is said to be why.
#include "quarn/run/Ledger.h"

#include "storage/WholeFile.h"
#include "support/TemporaryFolder.h"
#include "support/failureOf.h"

#include <gmock/gmock.h>

namespace quarn {
namespace {

namespace fs = std::filesystem;
using testing::HasSubstr;

/// A folder with one step that was done.
class LedgerTest : public testing::Test {
protected:
    LedgerTest() {
        write("scene.json", "scene");
        write("tool.py", "tool");
        write("out/points.npy", "points");
        write("model/a", "a");
        step.name = "skin";
        step.words = {"play", "scene.json", "--frames", "1-5", "--tool=" + (folder.path() / "tool.py").string()};
        step.inputs = {"scene.json"};
        step.outputs = {"out/points.npy", "model"};
        Ledger ledger(folder.path());
        ledger.begin(step, "quarn 1");
        ledger.finish(step);
    }
    void write(const char* name, const char* text) const { storage::writeWhole(folder.path() / name, text); }
    std::string why(const std::string& version = "quarn 1") const {
        return Ledger(folder.path()).whyToDo(step, version);
    }

    TemporaryFolder folder;
    Step step;
};

TEST_F(LedgerTest, NothingIsDoneTwice) {
    EXPECT_EQ(why(), "");
    write("scene.json", "scene"); // the same once more
    EXPECT_EQ(why(), "");
    const TemporaryFolder other;
    fs::copy(folder.path(), other.path() / "moved", fs::copy_options::recursive);
    EXPECT_EQ(Ledger(other.path() / "moved").whyToDo(step, "quarn 1"), "");
}

TEST_F(LedgerTest, SaysWhatHasChanged) {
    const std::vector<std::pair<std::function<void()>, const char*>> rows = {
        {[&] { write("scene.json", "SCENE"); }, "its input scene.json has changed"},
        {[&] { write("tool.py", "TOOL"); }, "/tool.py has changed"},
        {[&] { step.words[3] = "1-6"; }, "its arguments are others: --frames 1-6, was --frames 1-5"},
        {[&] { step.words.pop_back(); }, "its arguments are others: no more, was --tool="},
        {[&] { step.inputs.emplace_back("out/points.npy"); }, "its input out/points.npy is new"},
        {[&] { step.inputs.erase(step.inputs.begin()); }, "its input scene.json is none any more"},
        {[&] { write("out/points.npy", "POINTS"); }, "its output out/points.npy has changed"},
        {[&] { fs::remove(folder.path() / "out/points.npy"); }, "its output out/points.npy is not there"},
        {[&] { write("model/b", "b"); }, "its output model has changed"},
        {[&] { step.name = "skins"; }, "it was not done yet"}};
    for (const auto& [change, sentence] : rows) {
        const Step before = step;
        change();
        EXPECT_THAT(why(), HasSubstr(sentence));
        step = before;
        for (const auto& [name, text] :
             {std::pair("scene.json", "scene"), std::pair("tool.py", "tool"), std::pair("out/points.npy", "points")})
            write(name, text);
        fs::remove(folder.path() / "model/b");
        ASSERT_EQ(why(), "") << sentence;
    }
    EXPECT_EQ(why("quarn 2"), "its program is quarn 2, was quarn 1");
}

TEST_F(LedgerTest, AStepThatHasBegunIsNotDone) {
    Ledger ledger(folder.path());
    ledger.begin(step, "quarn 1");
    EXPECT_EQ(ledger.whyToDo(step, "quarn 1"), "it was not done yet");
    fs::remove_all(folder.path() / "model");
    EXPECT_THAT(failureOf([&] { ledger.finish(step); }), HasSubstr("skin has not written"));
    EXPECT_EQ(ledger.whyToDo(step, "quarn 1"), "it was not done yet");
    step.inputs = {"none.json"};
    EXPECT_THAT(failureOf([&] { ledger.begin(step, "quarn 1"); }),
                HasSubstr("none.json, which skin needs, is not there"));
}

TEST_F(LedgerTest, AFileOfSomethingElseIsRefused) {
    for (const char* text : {"[]", "{}", R"({"format": "quarn run", "version": 2, "steps": {}, "files": {}})",
                             R"({"format": "quarn run", "version": 1, "steps": {"a": {}}, "files": {}})",
                             R"({"format": "quarn run", "version": 1, "steps": [], "files": {}})"}) {
        write("run.json", text);
        EXPECT_THAT(failureOf([&] { Ledger ledger(folder.path()); }), HasSubstr("run.json is not what a quarn run"));
    }
}

} // namespace
} // namespace quarn
