// SPDX-License-Identifier: Apache-2.0
// Words read by a syntax: what is accepted, and what is said about what is not.
#include "openquarn/HArgDatabase.h"

#include <gtest/gtest.h>

#include <string>
#include <vector>

namespace {

// as much of everything as one command can have
HSyntax syntax() {
    HSyntax made;
    EXPECT_FALSE(made.addFlag("-mi", "-multiIndex", HSyntax::kUnsigned).error());
    EXPECT_FALSE(made.makeFlagMultiUse("multiIndex").error());
    EXPECT_FALSE(made.addFlag("rm", "reloadModel").error());
    EXPECT_FALSE(made.addFlag("-exp", "-exportActive", HSyntax::kBoolean).error());
    EXPECT_FALSE(made.addFlag("-r", "-range", HSyntax::kDouble, HSyntax::kLong, HSyntax::kString).error());
    EXPECT_FALSE(made.addArg(HSyntax::kString).error());
    EXPECT_FALSE(made.addArg(HSyntax::kDouble).error());
    EXPECT_FALSE(made.setObjectType(HSyntax::kStringObjects, 0, 2).error());
    return made;
}

HArgList list(const std::vector<const char*>& words) {
    HArgList made;
    for (const char* word : words)
        made.addArg(word);
    return made;
}

HStatus parse(const HSyntax& by, const std::vector<const char*>& words) {
    HStatus status;
    const HArgDatabase parsed(by, list(words), &status);
    return status;
}

TEST(ArgParser, GivesFlagsArgumentsAndObjectsByEitherName) {
    HStatus status;
    const HArgParser parsed(syntax(),
                            list({"-mi", "3", "node", "-exportActive", "Off", "-multiIndex", "4294967295", "-2.5", "-r",
                                  "-1e3", "-7", "x y", "o1", "-5"}),
                            &status);
    ASSERT_FALSE(status.error()) << status.errorString().asChar();
    EXPECT_TRUE(parsed.isFlagSet("-exp", &status) && parsed.isFlagSet("exportActive"));
    EXPECT_FALSE(parsed.isFlagSet("-rm", &status) || status.error());
    EXPECT_EQ(parsed.numberOfFlagUses("-mi"), 2U);
    EXPECT_EQ(parsed.numberOfFlagsUsed(), 4U);

    unsigned index = 0;
    EXPECT_FALSE(parsed.getFlagArgument("-multiIndex", 0, index).error());
    EXPECT_EQ(index, 3U);
    HArgList use;
    ASSERT_FALSE(parsed.getFlagArgumentList("-mi", 1, use).error());
    EXPECT_EQ(use.asString(0), "4294967295");
    EXPECT_EQ(use.asInt(0, &status), 0);
    EXPECT_TRUE(status.error()); // does not fit
    bool active = true;
    EXPECT_FALSE(parsed.getFlagArgument("exp", 0, active).error());
    EXPECT_FALSE(active);
    double from = 0;
    int to = 0;
    HString label;
    EXPECT_FALSE(parsed.getFlagArgument("-r", 0, from).error());
    EXPECT_FALSE(parsed.getFlagArgument("-r", 1, to).error());
    EXPECT_FALSE(parsed.getFlagArgument("-r", 2, label).error());
    EXPECT_TRUE(from == -1000 && to == -7 && label == "x y");

    EXPECT_EQ(parsed.commandArgumentString(0), "node");
    EXPECT_EQ(parsed.commandArgumentDouble(1), -2.5);
    HArgList objects;
    ASSERT_FALSE(parsed.getObjects(objects).error());
    EXPECT_EQ(objects.length(), 2U);
    EXPECT_EQ(objects.asInt(1), -5);
}

TEST(ArgParser, SaysWhatIsWrongWithWhichWord) {
    struct Case {
        std::vector<const char*> words;
        const char* text;
    };
    const std::vector<Case> cases{
        {{"n", "1", "-nope"}, "unknown flag '-nope'"},
        {{"n", "1", "-reload"}, "unknown flag '-reload'"}, // no abbreviations
        {{}, "argument 1 (text) is missing"},
        {{"n"}, "argument 2 (number) is missing"},
        {{"n", "1x"}, "argument 2 (number): '1x' is not a finite number"},
        {{"n", "nan"}, "argument 2 (number): 'nan' is not a finite number"},
        {{"n", "1e999"}, "argument 2 (number): '1e999' is not a finite number"},
        {{"n", ""}, "argument 2 (number): '' is not a finite number"},
        {{"n", "1", "a", "b", "c"}, "too many arguments: 'c'"},
        {{"n", "1", "-rm", "-rm"}, "flag '-reloadModel' is given more than once"},
        {{"n", "1", "-mi"}, "flag '-multiIndex', argument 1 (unsigned integer) is missing"},
        {{"n", "1", "-mi", "-rm"}, "flag '-multiIndex', argument 1 (unsigned integer) is missing"},
        {{"-mi", "-1", "n", "1"},
         "flag '-multiIndex', argument 1 (unsigned integer): '-1' is not an integer from 0 to 4294967295"},
        {{"-r", "1", "2147483648", "x", "n", "1"},
         "flag '-range', argument 2 (integer): '2147483648' is not an integer from -2147483648 to 2147483647"},
        {{"-exp", "maybe", "n", "1"},
         "flag '-exportActive', argument 1 (boolean): 'maybe' is not a boolean (true, on, yes, 1, false, off, no or "
         "0)"},
    };
    for (const Case& wrong : cases) {
        const HStatus status = parse(syntax(), wrong.words);
        EXPECT_EQ(status, HStatus::kFailure);
        EXPECT_EQ(status.errorString().asStdString(), wrong.text);
    }
    HSyntax some = syntax();
    EXPECT_FALSE(some.setObjectType(HSyntax::kStringObjects, 2).error());
    EXPECT_EQ(parse(some, {"n", "1", "a"}).errorString(), "too few arguments: 3 of at least 4");
}

TEST(ArgParser, QueryTakesTheArgumentsAway) {
    HSyntax both = syntax();
    EXPECT_EQ(parse(both, {"-q", "-mi"}).errorString(), "unknown flag '-q'");
    both.enableQuery(true);
    both.enableEdit(true);
    HStatus status;
    const HArgParser parsed(both, list({"-range", "-query"}), &status);
    EXPECT_FALSE(status.error()) << status.errorString().asChar();
    EXPECT_TRUE(parsed.isQuery() && !parsed.isEdit() && parsed.isFlagSet("-r"));
    double from = 0;
    EXPECT_EQ(parsed.getFlagArgument("-r", 0, from), HStatus::kFailure);
    EXPECT_TRUE(HArgParser(both, list({"n", "1", "-e"})).isEdit());
    EXPECT_TRUE(parse(syntax(), {"n", "1", "-e"}).error()); // the copy was changed alone
}

TEST(ArgParser, ReadsAreCheckedAndLeaveTheResultAlone) {
    const HArgParser parsed(syntax(), list({"node", "1.5", "-mi", "4"}));
    int number = 42;
    HStatus status;
    EXPECT_EQ(parsed.getFlagArgument("-nope", 0, number), HStatus::kInvalidParameter);
    EXPECT_EQ(parsed.getFlagArgument("-exp", 0, number), HStatus::kFailure); // not given
    EXPECT_EQ(parsed.getFlagArgument("-mi", 1, number), HStatus::kFailure);
    EXPECT_EQ(parsed.getCommandArgument(0, number), HStatus::kFailure);
    EXPECT_EQ(parsed.getCommandArgument(1, number), HStatus::kFailure); // 1.5
    EXPECT_EQ(parsed.getCommandArgument(2, number), HStatus::kFailure);
    EXPECT_EQ(number, 42);
    HArgList use = list({"kept"});
    EXPECT_EQ(parsed.getFlagArgumentList("-mi", 1, use), HStatus::kFailure);
    EXPECT_EQ(use.asString(0), "kept");
    EXPECT_FALSE(parsed.isFlagSet("-nope", &status));
    EXPECT_EQ(status, HStatus::kInvalidParameter);

    const HArgParser failed(syntax(), list({"node"}), &status);
    ASSERT_TRUE(status.error());
    EXPECT_EQ(failed.commandArgumentString(0, &status), "");
    EXPECT_TRUE(status.error());
    EXPECT_FALSE(failed.isFlagSet("-mi", &status));
    EXPECT_TRUE(status.error());
    EXPECT_TRUE(failed.getObjects(use).error());
}

TEST(Syntax, RefusesWhatNoCommandLineCouldMean) {
    HSyntax made;
    EXPECT_FALSE(made.addFlag("-a", "-all").error());
    for (const char* name : {"", "-", "-1", "--x", "-a", "-all", "a b", "-q", "-query", "-e", "-edit"}) {
        EXPECT_EQ(made.addFlag(name, "-other"), HStatus::kInvalidParameter) << name;
        EXPECT_EQ(made.addFlag("-o", name), HStatus::kInvalidParameter) << name;
    }
    EXPECT_EQ(made.addFlag("-o", "-other", HSyntax::kNoArg, HSyntax::kLong), HStatus::kInvalidParameter);
    EXPECT_EQ(made.addFlag("-o", "-other", HSyntax::kInvalidArgType), HStatus::kInvalidParameter);
    EXPECT_EQ(made.addArg(HSyntax::kNoArg), HStatus::kInvalidParameter);
    EXPECT_EQ(made.setObjectType(HSyntax::kStringObjects, 2, 1), HStatus::kInvalidParameter);
    EXPECT_EQ(made.makeFlagMultiUse("-nope"), HStatus::kInvalidParameter);
    EXPECT_FALSE(made.addFlag("-o", "-other").error()); // nothing of the refused ones stayed
}

TEST(ArgList, ReadsWordsAndNamesTheBadOnes) {
    HArgList words = list({"on", "+3", "0x10", "1 ", "-0"});
    words.addArg(0.1);
    HStatus status;
    EXPECT_TRUE(words.asBool(0));
    EXPECT_EQ(words.asInt(1), 3);
    EXPECT_EQ(words.asInt(4, &status), 0);
    EXPECT_FALSE(status.error());
    EXPECT_EQ(words.asDouble(5), 0.1);
    EXPECT_EQ(words.asDouble(2, &status), 0);
    EXPECT_EQ(status.errorString(), "'0x10' is not a finite number");
    EXPECT_EQ(words.asInt(3, &status), 0);
    EXPECT_TRUE(status.error());
    EXPECT_EQ(words.asString(6, &status), "");
    EXPECT_EQ(status.errorString(), "there is no word 6: there are 6");
}

} // namespace
