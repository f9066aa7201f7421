// SPDX-License-Identifier: Apache-2.0
// The folder of a run: its steps, done in their order, each once.
#pragma once

#include "quarn/console/Console.h"
#include "quarn/run/Ledger.h"
#include "quarn/run/RunProgress.h"
#include "quarn/run/plan.h"
#include "quarn/run/programs.h"

namespace quarn {

/// What became of a step, or is to become of it.
struct StepState {
    std::string label;
    bool isDone = false;   ///< now, whether by this run or an earlier one
    std::string why;       ///< it was done, or would be; empty when nothing was to be done
    double seconds = 0.0;  ///< that it took in this run
    bool isBehind = false; ///< nothing is to be done but for what steps before it may bring
};

/// Errors are std::runtime_error with the sentence for the user. Thread: main.
class RunFolder {
public:
    /// `settings` resolved and checked. Throws for a folder that is not empty, and none of a run.
    RunFolder(const RunSettings& settings, const std::filesystem::path& folder, const Console& console);

    /// Does what is to be done, up to the steps named `until`; all when that is empty. Answers each step that was
    /// looked at. Throws for a step that fails, with the end of what it said; Interrupted.
    std::vector<StepState> run(const std::string& until);
    /// What run() would do, as far as it can be told before it has: of steps that follow from another one's answer
    /// there may be more. Changes nothing.
    std::vector<StepState> explain(const std::string& until);

    /// Of the steps that are done.
    RunFacts facts() const { return readFacts(folder_); }
    const std::filesystem::path& path() const { return folder_; }

private:
    RunFacts known();
    const FoundProgram& program(const Step& step);
    std::string versionOf(const Step& step);
    std::filesystem::path logOf(const Step& step) const;
    std::vector<StepState> runSteps(const std::string& until);
    void prepare(const Step& step) const;
    void start(const Step& step);
    void perform(const Step& step);
    std::string failureOf(const Step& step, const std::string& why) const;
    void tellOf(const Step& step) const;
    double doStep(const Step& step, const std::string& why);

    const RunSettings& settings_;
    std::filesystem::path folder_;
    const Console& console_;
    Ledger ledger_;
    RunProgress progress_;
    std::map<Program, FoundProgram> programs_;
};

} // namespace quarn
