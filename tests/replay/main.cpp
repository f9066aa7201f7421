// SPDX-License-Identifier: Apache-2.0
// replay_cases DIR: replays reference cases through the real code; `usage` lists the options.
#include "kinds.h"
#include "replayOnDevice.h"

#include <algorithm>
#include <cstdio>
#include <cstring>
#include <exception>
#include <map>
#include <string>

namespace {

using replay::Case;
using replay::Kind;
using CasesByKind = std::map<std::string, std::vector<Case*>>;

constexpr const char* usage =
    "usage: replay_cases DIR [--exact | --evaluator gpu [--device DEVICE]] [--skip-if-absent]\n"
    "  DIR               a folder of reference cases, one JSON file each\n"
    "  --exact           compare with tolerance 0\n"
    "  --evaluator gpu   replay the scenarios alone, and compare the positions that an OpenCL device gives\n"
    "  --device DEVICE   which device: a number, or a part of its name; else the first\n"
    "  --skip-if-absent  exit 77 instead of 2 when DIR, or a device, is not there\n"
    "Exit status: 0 all passed, 1 a failure, 2 the cases or the arguments are unusable.\n";

struct Options {
    std::string folder;
    bool exact = false;
    bool skipIfAbsent = false;
    std::string evaluator = "cpu";
    std::string device;
};

// Takes what is given to "--evaluator" and "--device"; null for every other argument, which has nothing.
std::string* valueOf(const std::string& argument, Options& options) {
    if (argument == "--evaluator")
        return &options.evaluator;
    return argument == "--device" ? &options.device : nullptr;
}

bool isConsistent(const Options& options) {
    const bool isGpu = options.evaluator == "gpu";
    return !options.folder.empty() && (isGpu || options.evaluator == "cpu") && (isGpu || options.device.empty()) &&
           options.exact + isGpu <= 1;
}

bool parse(int argc, char** argv, Options& options) {
    for (int i = 1; i < argc; ++i) {
        const std::string argument = argv[i];
        if (std::string* value = valueOf(argument, options); value && i + 1 < argc)
            *value = argv[++i];
        else if (argument == "--exact")
            options.exact = true;
        else if (argument == "--skip-if-absent")
            options.skipIfAbsent = true;
        else if (argument.starts_with("-") || !options.folder.empty())
            return false;
        else
            options.folder = argument;
    }
    return isConsistent(options);
}

// Passes and failures so far.
struct Tally {
    std::size_t passed = 0;
    std::size_t failed = 0;

    void count(bool ok) { ++(ok ? passed : failed); }
    void failure(const std::string& what) {
        std::printf("%s\n", what.c_str());
        ++failed;
    }
};

// Every disagreement: values, keys of the expected result that nothing was compared with, members of the input that
// nothing read, and an exception as one.
std::vector<replay::Disagreement> replayCase(const Kind& kind, const Case& testCase, double tolerance) {
    rapidjson::Document results;
    replay::Input input(testCase.input(), testCase.folder);
    try {
        const replay::Json actual = kind.replay(input, results.GetAllocator());
        auto disagreements = replay::compare(testCase.expected(), actual, tolerance);
        for (const std::string& key : input.unread())
            disagreements.push_back({"input." + key, "(read by the replay)", "(not read)"});
        return disagreements;
    } catch (const std::exception& error) {
        return {{"(exception)", "none", error.what()}};
    }
}

void reportDisagreements(const Case& testCase, const std::vector<replay::Disagreement>& disagreements) {
    for (const auto& [where, expected, actual] : disagreements)
        std::printf("%s: %s: expected %s, got %s\n", testCase.name.c_str(), where.c_str(), expected.c_str(),
                    actual.c_str());
}

void replayKind(const Kind& kind, const std::vector<Case*>& cases, bool exact, Tally& tally) {
    std::size_t failed = 0;
    for (const Case* testCase : cases) {
        const auto disagreements = replayCase(kind, *testCase, exact ? 0.0 : testCase->tolerance);
        reportDisagreements(*testCase, disagreements);
        tally.count(disagreements.empty());
        failed += disagreements.empty() ? 0U : 1U;
    }
    std::printf("%zu cases of kind %s, %zu failed\n", cases.size(), kind.name.data(), failed);
}

void runAll(CasesByKind& byKind, const Options& options, Tally& tally) {
    for (const Kind& kind : replay::kinds) {
        const auto& cases = byKind[std::string(kind.name)];
        if (cases.empty())
            tally.failure("0 cases of kind " + std::string(kind.name) + ": there must be some");
        else
            replayKind(kind, cases, options.exact, tally);
    }
    for (const auto& [name, cases] : byKind)
        if (std::none_of(std::begin(replay::kinds), std::end(replay::kinds),
                         [&name = name](const Kind& kind) { return kind.name == name; }))
            tally.failure(std::to_string(cases.size()) + " cases of the unknown kind " + name);
}

int replayScenariosOnDevice(const std::vector<Case>& cases, const Options& options) {
    if (!replay::chooseDevice(options.device)) {
        std::printf("there is no OpenCL device: nothing was compared\n");
        return options.skipIfAbsent ? 77 : 2;
    }
    Tally tally;
    replay::DeviceTally steps;
    for (const Case& testCase : cases) {
        if (testCase.kind != "scenario")
            continue;
        const auto disagreements = replay::replayOnDevice(testCase, steps);
        reportDisagreements(testCase, disagreements);
        tally.count(disagreements.empty());
    }
    std::printf("%s: %zu steps compared, of which %zu passed through; %zu more were the CPU's, %zu left out\n",
                steps.device.c_str(), steps.compared, steps.passedThrough, steps.onCpu, steps.leftOut);
    std::printf("%zu passed, %zu failed\n", tally.passed, tally.failed);
    return tally.failed == 0 && steps.compared > steps.passedThrough ? 0 : 1;
}

int run(const Options& options) {
    if (!std::filesystem::is_directory(options.folder)) {
        std::printf("the reference cases were not there: %s\n", options.folder.c_str());
        return options.skipIfAbsent ? 77 : 2;
    }
    auto cases = replay::readCases(options.folder);
    if (options.evaluator == "gpu")
        return replayScenariosOnDevice(cases, options);
    CasesByKind byKind;
    for (Case& testCase : cases)
        byKind[testCase.kind].push_back(&testCase);
    Tally tally;
    runAll(byKind, options, tally);
    std::printf("%zu passed, %zu failed\n", tally.passed, tally.failed);
    return tally.failed == 0 ? 0 : 1;
}

} // namespace

int main(int argc, char** argv) {
    Options options;
    if (!parse(argc, argv, options)) {
        std::fputs(usage, stderr);
        return 2;
    }
    try {
        return run(options);
    } catch (const std::exception& error) {
        std::fprintf(stderr, "replay_cases: %s\n", error.what());
        return 2;
    }
}
