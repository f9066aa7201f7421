// SPDX-License-Identifier: Apache-2.0
// What a program that is started gets, how its end is told, and that nothing of it stays behind.
#include "quarn/process/runProgram.h"

#include "quarn/console/interrupt.h"
#include "quarn/process/ownVariable.h"
#include "storage/openToAppend.h"
#include "storage/readWholeFile.h"
#include "support/TemporaryFolder.h"
#include "support/failureOf.h"

#include <gmock/gmock.h>

#include <csignal>
#include <cstdlib>
#include <thread>

namespace quarn {
namespace {

using testing::HasSubstr;

/// A call of a shell script, whose log is read back.
class Call {
public:
    explicit Call(const std::string& script) { call.words = {"/bin/sh", "-c", script}; }
    ProgramEnd run(const std::function<void()>& meanwhile = {}) {
        call.log = log_.number();
        return runProgram(call, meanwhile);
    }
    std::string log() const { return storage::readWholeFile(folder_.path() / "log", 1 << 20); }
    const std::filesystem::path& folder() const { return folder_.path(); }
    ProgramCall call;

private:
    TemporaryFolder folder_;
    storage::Descriptor log_ = storage::openToAppend(folder_.path() / "log", "");
};

TEST(RunProgram, GivesWordsAsTheyAreAnEmptyInputAndItsFolder) {
    Call call("printf '%s\\n' \"$@\"; cat; pwd; echo \"$NW_TOLD\" >&2");
    call.call.words.insert(call.call.words.end(), {"name", "a  b", "$(echo x)", "*", ""});
    call.call.folder = "/";
    call.call.environment = {{"NW_TOLD", "told"}};
    EXPECT_TRUE(call.run().isGood());
    EXPECT_EQ(call.log(), "a  b\n$(echo x)\n*\n\n/\ntold\n");

    const storage::Descriptor answer = storage::openToAppend(call.folder() / "answer", "");
    call.call.output = answer.number();
    call.call.words = {"sh", "-c", "echo found on the PATH"};
    EXPECT_TRUE(call.run().isGood());
    EXPECT_EQ(storage::readWholeFile(call.folder() / "answer", 100), "found on the PATH\n");
}

TEST(RunProgram, KeepsItsOwnVariablesToItself) {
    ::setenv("NW_THEIRS", "theirs", 1);
    for (const char* name : {"NW_OURS", "NW_TOLD", "NW_THEIRS"})
        setOwnVariable(name, "ours");
    EXPECT_STREQ(std::getenv("NW_OURS"), "ours");
    Call call("echo \"${NW_OURS-none} $NW_TOLD $NW_THEIRS\"");
    call.call.environment = {{"NW_TOLD", "told"}};
    EXPECT_TRUE(call.run().isGood());
    EXPECT_EQ(call.log(), "none told theirs\n");
}

TEST(RunProgram, TellsHowItEnded) {
    for (const auto& [script, text] : {std::pair("exit 3", "ended with status 3"),
                                       std::pair("kill -SEGV $$", "was ended by signal 11 (Segmentation fault)")}) {
        const ProgramEnd end = Call(script).run();
        EXPECT_FALSE(end.isGood());
        EXPECT_EQ(end.text(), text);
    }
    Call none("");
    none.call.words = {"/none/such"};
    EXPECT_EQ(failureOf([&] { none.run(); }), "/none/such could not be started: No such file or directory");
    Call nowhere("true");
    nowhere.call.folder = "/none";
    EXPECT_THAT(failureOf([&] { nowhere.run(); }), HasSubstr("could not be started"));
}

// the process whose number a script has said first is there no more, or not but for whoever is to ask for its status
bool isGone(const std::string& number) {
    const std::string status = "/proc/" + number.substr(0, number.find('\n')) + "/status";
    for (int i = 0; i < 1000; ++i) {
        try {
            if (storage::readWholeFile(status, 1 << 20).find("State:\tZ") != std::string::npos)
                return true;
        } catch (const std::exception&) {
            return true;
        }
        std::this_thread::sleep_for(std::chrono::milliseconds(10));
    }
    return false;
}

TEST(RunProgram, LeavesNothingBehind) {
    for (const char* rest :
         {"exit 0", "exec sleep 1000", "trap 'echo asked >&2; exit' TERM; while :; do sleep 0.1; done",
          "trap 'echo asked' TERM; while :; do sleep 0.1; done"}) {
        Call call("sleep 1000 & echo $!; " + std::string(rest));
        call.call.timeout = std::chrono::seconds(2);
        call.call.grace = std::chrono::seconds(2);
        const std::string failure = failureOf([&] { call.run(); });
        EXPECT_EQ(failure, std::string(rest) == "exit 0" ? "" : "takes more than 2 s");
        EXPECT_TRUE(isGone(call.log())) << rest;
        EXPECT_EQ(call.log().find("asked") != std::string::npos, std::string(rest).find("trap") == 0) << call.log();
    }
}

TEST(RunProgram, EndsWhenTheUserAsksForIt) {
    watchForInterrupt();
    Call call("echo $$; exec sleep 1000");
    EXPECT_THROW(call.run([] { std::raise(SIGINT); }), Interrupted);
    EXPECT_TRUE(isGone(call.log()));
}

} // namespace
} // namespace quarn
