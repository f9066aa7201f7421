// SPDX-License-Identifier: Apache-2.0
// replay_cases DIR: replays reference cases through the real code; --help lists the options.
#include "kinds.h"
#include "replayOnDevice.h"

#include <CLI/CLI.hpp>

#include <algorithm>
#include <cstdio>
#include <exception>
#include <map>
#include <string>

namespace {

using replay::Case;
using replay::Kind;
using CasesByKind = std::map<std::string, std::vector<Case*>>;

struct Options {
    std::string folder;
    bool exact = false;
    bool skipIfAbsent = false;
    std::string evaluator;
    std::string device;
};

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
    CLI::App app("Replays reference cases through the real code.\n"
                 "Exit status: 0 all passed, 1 a failure, 2 the cases or the arguments are unusable.");
    app.add_option("DIR", options.folder, "a folder of reference cases, one JSON file each")->required();
    auto* exact = app.add_flag("--exact", options.exact, "compare with tolerance 0");
    auto* evaluator =
        app.add_option("--evaluator", options.evaluator,
                       "replay the scenarios alone, and compare the positions that an OpenCL device gives")
            ->check(CLI::IsMember({"gpu"}))
            ->excludes(exact);
    app.add_option("--device", options.device, "which device: a number, or a part of its name; else the first")
        ->needs(evaluator);
    app.add_flag("--skip-if-absent", options.skipIfAbsent, "exit 77 instead of 2 when DIR, or a device, is not there");
    try {
        app.parse(argc, argv);
        return run(options);
    } catch (const CLI::ParseError& error) {
        return app.exit(error) == 0 ? 0 : 2;
    } catch (const std::exception& error) {
        std::fprintf(stderr, "replay_cases: %s\n", error.what());
        return 2;
    }
}
