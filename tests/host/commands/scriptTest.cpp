// SPDX-License-Identifier: Apache-2.0
// Scripts: how text becomes commands, what stops one, and what results a command leaves.
#include "openquarn/HGlobal.h"
#include "openquarn/HPxCommand.h"
#include "openquarn_app/Commands.h"
#include "openquarn_app/Messages.h"
#include "support/TemporaryFolder.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <fstream>
#include <stdexcept>

namespace {

using OpenQuarn::CommandOutcome;
using OpenQuarn::CommandValue;
using OpenQuarn::printedValue;
using OpenQuarn::quotedWord;
using OpenQuarn::runCommand;
using OpenQuarn::runScript;
using testing::HasSubstr;

// a command of the test while the object lives, which runs the given function
class TestCommand {
public:
    using Body = std::function<HStatus(const HPxCommand&, const HArgList&)>;
    TestCommand(std::string name, const Body& body)
        : name_(std::move(name)) {
        const HStatus status = OpenQuarn::addCommand(name_, [body] { return new Object(body); });
        EXPECT_FALSE(status.error()) << status.errorString().asChar();
    }
    ~TestCommand() { EXPECT_FALSE(OpenQuarn::removeCommand(name_).error()); }
    TestCommand(const TestCommand&) = delete;
    TestCommand& operator=(const TestCommand&) = delete;

private:
    class Object : public HPxCommand {
    public:
        explicit Object(Body body)
            : body_(std::move(body)) {}
        HStatus doIt(const HArgList& args) override { return body_(*this, args); }

    private:
        Body body_;
    };
    std::string name_;
};

// gives its words back, and an array of none for none
HStatus wordsBack(const HPxCommand& /*self*/, const HArgList& args) {
    HStringArray words;
    for (unsigned i = 0; i < args.length(); ++i)
        words.append(args.asString(i));
    return HPxCommand::setResult(words);
}

using Words = std::vector<std::string>;

TEST(Script, SplitsIntoWords) {
    const TestCommand words("words", wordsBack);
    const std::vector<std::pair<std::string, Words>> cases{
        {"words", {}},
        {"words a\tb   c ;", {"a", "b", "c"}},
        {R"(words "a b" 'c "d" \n' "e\"f\\g\nh\ti" "" '')", {"a b", R"(c "d" \n)", "e\"f\\g\nh\ti", "", ""}},
        {R"(words a"b c"'d'e models[3].name)", {"ab cde", "models[3].name"}},
        {"words a # b", {"a"}},
        {"words a // b", {"a"}},
        {"words a#b http://c 'x # y' \"// z\" // 'not closed", {"a#b", "http://c", "x # y", "// z"}},
        {"words a \\\n  b\\\r\nc \\d", {"a", "b", "c", "\\d"}},
        {"words a; words b\r\n\n;;words c;", {"c"}},
        {"\xEF\xBB\xBFwords \xC3\xA4", {"\xC3\xA4"}},
    };
    for (const auto& [text, expected] : cases) {
        const CommandOutcome outcome = runCommand(text);
        ASSERT_TRUE(outcome.ok) << text << ": " << outcome.error;
        EXPECT_EQ(std::get<Words>(outcome.result), expected) << text;
    }
}

TEST(Script, AnyTextSurvivesQuoting) {
    const TestCommand words("words", wordsBack);
    for (const std::string text : {"", "plain", "a b", "-flag", "\"", "\\", "it's", "a\nb\tc", "#x", "//x", "a;b", "`"})
        EXPECT_EQ(std::get<Words>(runCommand("words " + quotedWord(text)).result), Words{text}) << text;
    EXPECT_EQ(quotedWord("node.tx"), "node.tx");
}

TEST(Script, ErrorsNameFileLineAndCommandAndStopIt) {
    int runs = 0;
    const TestCommand count("count", [&](const HPxCommand&, const HArgList&) {
        ++runs;
        return HStatus();
    });
    struct Case {
        const char* text;
        const char* error;
        int runsBefore;
    };
    const std::vector<Case> cases{
        {"count\n\n  nope 1 2\ncount", "s.oq, line 3: there is no command 'nope'", 1},
        {"count; count\nhelp nope\ncount", "s.oq, line 2: help: there is no command 'nope'", 2},
        {"count \\\n1 \\\n2\nhelp 1 2", "s.oq, line 4: help: too many arguments: '2'", 1},
        {"help \\\n1 \\\n2", "s.oq, line 1: help: too many arguments: '2'", 0},
        {"print 'a\nprint b'", "s.oq, line 1: the quote ' is not closed at the end of the line", 0},
        {"count\nprint \"a\\", "s.oq, line 2: the quote \" is not closed at the end of the line", 0},
        {"count\nprint \"C:\\p\"", "s.oq, line 2: unknown escape \\p in \"...\": \\\" \\\\ \\n and \\t are known", 0},
        {"count\ncount\nprint `help`",
         "s.oq, line 3: back-quoted commands are not supported: run the command on a "
         "line of its own",
         0},
        {"count\nprint \x01", "s.oq, line 2: a control character, code 1", 0},
    };
    for (const Case& wrong : cases) {
        runs = 0;
        const CommandOutcome outcome = runScript(wrong.text, "s.oq");
        EXPECT_FALSE(outcome.ok);
        EXPECT_EQ(outcome.error, wrong.error);
        EXPECT_EQ(outcome.result, CommandValue());
        EXPECT_EQ(runs, wrong.runsBefore) << wrong.text;
    }
    EXPECT_EQ(runCommand("nope").error, "there is no command 'nope'");
}

TEST(Script, AnErrorThatIsShownIsTold) {
    OpenQuarn::MessageSink before = OpenQuarn::setMessageSink([](const OpenQuarn::Message&) {});
    int runs = 0;
    const TestCommand show("show", [&](const HPxCommand&, const HArgList& args) {
        ++runs;
        const std::string kind = args.asString(0).asStdString();
        for (const OpenQuarn::Severity severity : {OpenQuarn::Severity::info, OpenQuarn::Severity::warning,
                                                   OpenQuarn::Severity::error, OpenQuarn::Severity::report})
            if (kind == severityName(severity))
                OpenQuarn::showMessage(severity, args.asString(1).asStdString());
        return kind == "fail" ? HStatus(HStatus::kFailure, "it failed") : HStatus();
    });
    const TestCommand inner("inner", [](const HPxCommand&, const HArgList& args) {
        return HGlobal::executeCommand(args.asString(0), false);
    });
    const TestCommand nested("nested", [](const HPxCommand&, const HArgList& args) {
        EXPECT_FALSE(runScript(args.asString(0).asStdString(), "n").shownError.empty());
        return HStatus();
    });
    const struct {
        const char* text;
        const char* error;
        const char* shown;
        int runs, runsWithStop;
    } rows[] = {
        {"show info a; show warning b", "", "", 2, 2},
        {"show info a\nshow error b\nshow error c", "", "s, line 2: show: b", 3, 2},
        {"show report a; show", "", "s, line 1: show: a", 2, 1},
        {"inner 'show error a'; show", "", "s, line 1: inner: a", 2, 1},
        {"nested 'show error a'; show", "", "s, line 1: nested: a", 2, 1},
        {"show error a\nshow fail\nshow", "s, line 2: show: it failed", "s, line 1: show: a", 2, 1},
        {"try show error a; try show fail; show", "", "", 3, 3},
        {"try show report a -flag 'b c'", "", "", 1, 1},
        {"inner 'try show error a; show error b'", "", "s, line 1: inner: b", 2, 2},
        {"try inner 'show error a'; show", "", "", 2, 2},
        {"try inner 'try show error a'; show", "s, line 1: try: no error came of 'inner'", "", 1, 1},
        {"show\ntry show warning a; show", "s, line 2: try: no error came of 'show'", "", 2, 2},
        {"try", "s, line 1: try: the command to be tried is missing", "", 0, 0},
        {"try nope", "", "", 0, 0},
    };
    for (const auto& row : rows)
        for (const bool stops : {false, true}) {
            SCOPED_TRACE(row.text);
            runs = 0;
            const CommandOutcome outcome =
                runScript(row.text, "s", {}, stops ? OpenQuarn::OnShownError::stop : OpenQuarn::OnShownError::goOn);
            EXPECT_EQ(runs, stops ? row.runsWithStop : row.runs);
            EXPECT_EQ(outcome.shownError, row.shown);
            if (runs == row.runs) {
                EXPECT_EQ(outcome.error, row.error);
            }
        }
    EXPECT_EQ(runCommand("try show error 'as expected'").result, CommandValue(std::string("as expected")));
    EXPECT_EQ(runCommand("try show fail").result, CommandValue(std::string("show: it failed")));
    OpenQuarn::setMessageSink(std::move(before));
}

TEST(Script, FilesAreReadAndNamed) {
    const TemporaryFolder folder;
    const std::string path = (folder.path() / "a script.oq").string();
    std::ofstream(path) << "help help\nhelp print\nhelp nope\n";
    std::vector<std::string> shown;
    const CommandOutcome outcome =
        OpenQuarn::runScriptFile(path, [&](const CommandValue& value) { shown.push_back(printedValue(value)); });
    EXPECT_EQ(outcome.error, path + ", line 3: help: there is no command 'nope'");
    ASSERT_EQ(shown.size(), 2U);
    EXPECT_THAT(shown[1], HasSubstr("print"));
    std::ofstream(path).close();
    EXPECT_TRUE(OpenQuarn::runScriptFile(path).ok);
    EXPECT_THAT(OpenQuarn::runScriptFile(path + "x").error, HasSubstr("x' does not exist"));
    EXPECT_THAT(OpenQuarn::runScriptFile("/dev/zero").error, HasSubstr("'/dev/zero' is no regular file"));
}

TEST(Results, OfEachKindArePrintedAndRead) {
    using Made = std::function<HStatus()>;
    const HIntArray integers{1, 2};
    const HDoubleArray numbers{0.5, 1e30};
    const HStringArray texts{"a b", "c"};
    const std::vector<std::tuple<Made, HCommandResult::Type, std::string>> cases{
        {[] { return HStatus(); }, HCommandResult::kInvalid, ""},
        {[] { return HPxCommand::setResult(-3); }, HCommandResult::kInt, "-3"},
        {[] { return HPxCommand::setResult(4294967295U); }, HCommandResult::kInt64, "4294967295"},
        {[] { return HPxCommand::setResult(true); }, HCommandResult::kBool, "true"},
        {[] { return HPxCommand::setResult(0.1); }, HCommandResult::kDouble, "0.1"},
        {[] { return HPxCommand::setResult("a b"); }, HCommandResult::kString, "a b"},
        {[&] { return HPxCommand::setResult(integers); }, HCommandResult::kIntArray, "1 2"},
        {[&] { return HPxCommand::setResult(numbers); }, HCommandResult::kDoubleArray, "0.5 1e+30"},
        {[&] { return HPxCommand::setResult(texts); }, HCommandResult::kStringArray, "a b\nc"},
    };
    for (const auto& [made, kind, printed] : cases) {
        HCommandResult::Type seen = HCommandResult::kInvalid;
        const TestCommand give("give", [&, made = made](const HPxCommand&, const HArgList&) {
            HStatus status = made();
            seen = HPxCommand::currentResultType();
            return status;
        });
        HCommandResult result;
        EXPECT_FALSE(HGlobal::executeCommand("give", result).error());
        EXPECT_EQ(result.resultType(), kind);
        EXPECT_EQ(seen, kind);
        EXPECT_EQ(printedValue(runCommand("give").result), printed);
        HString text("kept");
        EXPECT_EQ(result.getResult(text).error(), kind != HCommandResult::kString);
        EXPECT_EQ(text, kind == HCommandResult::kString ? "a b" : "kept");
        double number = 0;
        const bool isNumber = kind == HCommandResult::kInt || kind == HCommandResult::kInt64 ||
                              kind == HCommandResult::kBool || kind == HCommandResult::kDouble;
        EXPECT_EQ(result.getResult(number).error(), !isNumber);
    }
    EXPECT_EQ(static_cast<int>(HCommandResult::kString), 7); // plug-ins compare the number
}

TEST(Results, AreAppendedToWhereTheKindsAgree) {
    HStatus textRefused;
    const TestCommand grow("grow", [&](const HPxCommand&, const HArgList& args) {
        if (args.length() == 1)
            HPxCommand::setResult(HDoubleArray{1, 2});
        else if (args.length() == 2)
            HPxCommand::setResult(7);
        HPxCommand::appendToResult(3);
        HPxCommand::appendToResult(4.5);
        HPxCommand::appendToResult(HDoubleArray{5});
        textRefused = HPxCommand::appendToResult("text");
        return HStatus();
    });
    using Numbers = std::vector<double>;
    EXPECT_EQ(std::get<Numbers>(runCommand("grow").result), (Numbers{3, 4.5, 5}));
    EXPECT_EQ(std::get<Numbers>(runCommand("grow array").result), (Numbers{1, 2, 3, 4.5, 5}));
    EXPECT_EQ(std::get<Numbers>(runCommand("grow a single").result), (Numbers{7, 3, 4.5, 5}));
    EXPECT_EQ(textRefused.errorString(), "a text cannot be appended to an array of numbers");
}

TEST(Results, NestedCommandsKeepTheirOwn) {
    const TestCommand inner("inner", [](const HPxCommand&, const HArgList&) {
        EXPECT_EQ(HPxCommand::currentResultType(), HCommandResult::kInvalid);
        return HPxCommand::setResult("inner");
    });
    const TestCommand outer("outer", [](const HPxCommand&, const HArgList& args) {
        HPxCommand::setResult(1);
        HCommandResult result;
        EXPECT_FALSE(HGlobal::executeCommand("inner", result).error());
        EXPECT_EQ(result.resultType(), HCommandResult::kString);
        EXPECT_TRUE(HGlobal::executeCommand("nope", result).error());
        EXPECT_EQ(result.resultType(), HCommandResult::kInvalid);
        if (args.length() > 0)
            HPxCommand::clearResult();
        return HStatus();
    });
    EXPECT_EQ(runCommand("outer").result, CommandValue(1));
    EXPECT_EQ(runCommand("outer clear").result, CommandValue());
    EXPECT_TRUE(HPxCommand::setResult(1).error()); // none runs
    EXPECT_TRUE(HPxCommand::appendToResult(1.0).error());
    EXPECT_EQ(HPxCommand::currentResultType(), HCommandResult::kInvalid);
}

TEST(Commands, WhateverTheyDoEndsInASentence) {
    const TestCommand thrower("thrower", [](const HPxCommand&, const HArgList& args) -> HStatus {
        HPxCommand::setResult(1);
        if (args.length() == 0)
            throw std::runtime_error("as it does");
        throw 5; // NOLINT(misc-throw-by-value-catch-by-reference): plug-ins can throw anything
    });
    const TestCommand deep("deep", [](const HPxCommand&, const HArgList&) { return HGlobal::executeCommand("deep"); });
    const TestCommand silent("silent", [](const HPxCommand&, const HArgList&) -> HStatus { return HStatus::kFailure; });
    EXPECT_EQ(runCommand("thrower").error, "thrower: the command threw an exception: as it does");
    EXPECT_EQ(runCommand("thrower 1").error, "thrower: the command threw an exception of an unknown type");
    EXPECT_EQ(runCommand("thrower").result, CommandValue());
    EXPECT_THAT(runCommand("deep").error, HasSubstr("more than 100 deep"));
    EXPECT_EQ(runCommand("silent").error, "silent: failure");

    ASSERT_FALSE(OpenQuarn::addCommand("nothing", [] { return static_cast<HPxCommand*>(nullptr); }).error());
    EXPECT_EQ(runCommand("nothing").error, "nothing: the command could not be created");
    EXPECT_FALSE(OpenQuarn::removeCommand("nothing").error());
}

TEST(Commands, AreRegisteredOnceAndTakenAwayByTheirOwner) {
    const auto creator = [] { return static_cast<HPxCommand*>(nullptr); };
    const auto badSyntax = []() -> HSyntax { throw std::runtime_error("no syntax"); };
    for (const char* name : {"", "1a", "a b", "a.b", "help"})
        EXPECT_EQ(OpenQuarn::addCommand(name, creator), HStatus::kInvalidParameter) << name;
    EXPECT_EQ(OpenQuarn::addCommand("fresh", {}), HStatus::kInvalidParameter);
    EXPECT_THAT(OpenQuarn::addCommand("fresh", creator, badSyntax).errorString().asChar(), HasSubstr("no syntax"));
    EXPECT_EQ(OpenQuarn::removeCommand("fresh"), HStatus::kFailure);
    EXPECT_EQ(OpenQuarn::removeCommand("help"), HStatus::kFailure); // the host's

    HStatus removedWhileRunning;
    const TestCommand suicidal("suicidal", [&](const HPxCommand& self, const HArgList&) {
        EXPECT_FALSE(self.hasSyntax());
        removedWhileRunning = OpenQuarn::removeCommand("suicidal");
        return HStatus();
    });
    EXPECT_TRUE(runCommand("suicidal").ok);
    EXPECT_EQ(removedWhileRunning.errorString(), "the command 'suicidal' is running");
}

TEST(Commands, HelpShowsHowACommandIsWritten) {
    const auto creator = [] { return static_cast<HPxCommand*>(nullptr); };
    const auto syntax = [] {
        HSyntax made;
        made.addFlag("-mi", "-multiIndex", HSyntax::kUnsigned);
        made.makeFlagMultiUse("-mi");
        made.addArg(HSyntax::kString);
        return made;
    };
    ASSERT_FALSE(OpenQuarn::addCommand("described", creator, syntax).error());
    EXPECT_EQ(printedValue(runCommand("help described").result),
              "described [-mi|-multiIndex <unsigned integer>]... <text>");
    EXPECT_THAT(std::get<Words>(runCommand("help").result), testing::IsSupersetOf({"described", "help", "print"}));
    EXPECT_FALSE(OpenQuarn::removeCommand("described").error());
}

} // namespace
