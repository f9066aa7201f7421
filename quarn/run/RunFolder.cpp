// SPDX-License-Identifier: Apache-2.0
#include "quarn/run/RunFolder.h"

#include "quarn/console/Log.h"
#include "quarn/console/interrupt.h"
#include "quarn/console/numberText.h"
#include "quarn/process/runProgram.h"
#include "quarn/run/StepLine.h"
#include "quarn/run/targetProgram.h"
#include "storage/FileError.h"
#include "storage/Folder.h"
#include "storage/FolderLock.h"
#include "storage/LockedByAnother.h"
#include "storage/WholeFile.h"
#include "storage/openToAppend.h"
#include "storage/readWholeFile.h"

#include <algorithm>
#include <set>
#include <sstream>
#include <string_view>

namespace quarn {
namespace {

namespace fs = std::filesystem;

constexpr std::uint64_t mostOfAnAnswer = std::uint64_t{64} << 20U;

// what is in the way of a run: files that no run has put there
void requireOwn(const fs::path& folder) {
    std::error_code error;
    if (fs::exists(folder, error) && !fs::is_directory(folder, error))
        throw storage::FileError(folder, "is no folder");
    if (fs::exists(folder / Ledger::fileName, error))
        return;
    // of one whose first step failed
    const std::set<std::string> left = {
        storage::FolderLock::fileName, RunProgress::fileName, "log", "answers", "data", "scratch"};
    for (const fs::directory_entry& entry : fs::directory_iterator(folder, error))
        if (const std::string name = entry.path().filename().string(); left.count(name) == 0)
            throw storage::FileError(folder,
                                     "is not empty (" + name + "), and no folder of a quarn run: give a new one");
}

// the last lines of a text, indented, as an error shows them
std::string endOf(const std::string& text) {
    constexpr int lines = 15;
    std::size_t from = text.find_last_not_of('\n');
    const std::size_t end = from == std::string::npos ? 0 : from + 1;
    for (int line = 0; line < lines && from != std::string::npos && from > 0; ++line)
        from = text.rfind('\n', from - 1);
    const std::size_t begin = from == std::string::npos || end == 0 ? 0 : text[from] == '\n' ? from + 1 : from;
    std::string shown;
    for (std::size_t at = begin; at < end;) {
        const std::size_t next = std::min(text.find('\n', at), end);
        shown += "\n  | " + text.substr(at, next - at);
        at = next + 1;
    }
    return shown;
}

// what has something to count, and a flag for where
bool sayHowFar(const Step& step) {
    const bool isQuarn = step.program == Program::quarn && step.words.front() != "import";
    return isQuarn || (step.program == Program::trainer && step.words.front() == "train");
}

bool isNamed(const Step& step, const std::string& until) {
    return step.name == until;
}

// how many of the steps are to be looked at
std::size_t countUntil(const Plan& plan, const std::string& until) {
    const auto last = std::find_if(plan.rbegin(), plan.rend(), [&](const Step& step) { return isNamed(step, until); });
    return until.empty() || last == plan.rend() ? plan.size() : static_cast<std::size_t>(plan.rend() - last);
}

} // namespace

RunFolder::RunFolder(const RunSettings& settings, const fs::path& folder, const Console& console)
    : settings_(settings)
    , folder_(folder)
    , console_(console)
    , ledger_((requireOwn(folder), folder))
    , progress_(folder) {}

RunFacts RunFolder::known() {
    RunFacts all = facts();
    all.areLimitsEdited = ledger_.isForeign(limitsFile);
    return all;
}

const FoundProgram& RunFolder::program(const Step& step) {
    const auto found = programs_.find(step.program);
    if (found != programs_.end())
        return found->second;
    FoundProgram program;
    if (step.program != Program::targetCommand)
        program = step.program == Program::quarn ? thisQuarn() : findTrainer();
    return programs_.emplace(step.program, std::move(program)).first->second;
}

std::string RunFolder::versionOf(const Step& step) {
    return program(step).version;
}

fs::path RunFolder::logOf(const Step& step) const {
    return folder_ / "log" / (step.joined('-') + ".log");
}

void RunFolder::prepare(const Step& step) const {
    for (const fs::path& output : step.outputs)
        storage::makeFolders((folder_ / output).parent_path(), folder_ / output);
    std::error_code error;
    for (const fs::path& file : step.replaced)
        fs::remove(folder_ / file, error);
    fs::remove(logOf(step), error);
}

void RunFolder::start(const Step& step) {
    const storage::Descriptor log = storage::openToAppend(logOf(step), "");
    const fs::path counted = logOf(step).string() + ".progress";
    StepLine line(console_, progress_, step.label(), {counted, logOf(step)});
    if (step.request)
        return runTargetProgram(step, {folder_, log.number(), ledger_.digestOf(step, versionOf(step)),
                                       std::chrono::seconds(10), [&] { line.draw(); }});
    const fs::path said = logOf(step).string() + ".answer";
    std::error_code error;
    fs::remove(said, error);
    storage::Descriptor answer;
    if (!step.answer.empty())
        answer = storage::openToAppend(said, "");
    const FoundProgram& found = program(step);
    ProgramCall call;
    call.words = found.words;
    call.words.insert(call.words.end(), step.words.begin(), step.words.end());
    if (sayHowFar(step))
        call.words.insert(call.words.end(), {"--progress", counted.string()});
    call.folder = folder_;
    call.environment = found.environment;
    call.log = log.number();
    call.output = answer.number();
    runProgram(call, [&] { line.draw(); }).require();
    if (step.answer.empty())
        return;
    storage::writeWhole(folder_ / step.answer, storage::readWholeFile(said, mostOfAnAnswer));
    fs::remove(said, error);
}

std::string RunFolder::failureOf(const Step& step, const std::string& why) const {
    std::string said;
    try {
        said = endOf(storage::readWholeFile(logOf(step), mostOfAnAnswer));
    } catch (const std::exception&) { // NOLINT(bugprone-empty-catch): what the step failed for is what the user reads
    }
    return step.label() + " " + why + said + "\nall that it said is in " + logOf(step).string() +
           "; the same command goes on from there";
}

void RunFolder::perform(const Step& step) {
    prepare(step);
    try {
        start(step);
    } catch (const Interrupted&) {
        console_.note("what was done before " + step.label() + " is kept in " + folder_.string() +
                      ": the same command goes on from there");
        throw;
    } catch (const storage::LockedByAnother& error) {
        throw storage::LockedByAnother(failureOf(step, error.what()));
    } catch (const std::exception& error) {
        throw std::runtime_error(failureOf(step, error.what()));
    }
}

// what a user has to know of a step that went well: its warnings, the kind of deltas that it chose, and how far targets
// are from the skin
void RunFolder::tellOf(const Step& step) const {
    constexpr std::string_view mark = "warning: ";
    std::istringstream said(storage::readWholeFile(logOf(step), mostOfAnAnswer));
    for (std::string line; std::getline(said, line);)
        if (line.rfind(mark, 0) == 0)
            console_.warn(step.label() + ": " + line.substr(mark.size()));
        else if (line.rfind("chosen: ", 0) == 0)
            console_.note("  " + line);
    const RunFacts all = facts();
    const auto target = all.targets.find(step.answer.string());
    if (target == all.targets.end())
        return;
    const auto tellDistance = [&](const CacheFacts& cache, const char* what, const char* from) {
        if (cache.meanMm && cache.largestMm)
            console_.note(std::string("  ") + what + numberText(*cache.meanMm) + " mm from " + from + " in the mean, " +
                          numberText(*cache.largestMm) + " mm at most");
    };
    if (target->second.skin)
        tellDistance(*target->second.skin, "the skin is ", "quarn's own");
    tellDistance(target->second, "the targets are ", "the skin");
}

double RunFolder::doStep(const Step& step, const std::string& why) {
    const auto begin = std::chrono::steady_clock::now();
    const Stage stage([&] { return step.label() + ", as " + why; });
    progress_.count({});
    ledger_.begin(step, versionOf(step));
    perform(step);
    ledger_.finish(step);
    const std::chrono::duration<double> taken = std::chrono::steady_clock::now() - begin;
    StepLine::finish(console_, step.label(), taken.count());
    tellOf(step);
    return taken.count();
}

std::vector<StepState> RunFolder::run(const std::string& until) {
    const storage::FolderLock lock(folder_, "another quarn run");
    try {
        std::vector<StepState> states = runSteps(until);
        progress_.end("done");
        return states;
    } catch (const Interrupted&) {
        progress_.end("interrupted");
        throw;
    } catch (const std::exception& error) {
        progress_.end("failed", error.what());
        throw;
    }
}

std::vector<StepState> RunFolder::runSteps(const std::string& until) {
    std::vector<StepState> states;
    for (;;) {
        // with what the last step has answered
        const Plan plan = planOf(settings_, known());
        if (states.size() >= countUntil(plan, until))
            return states;
        throwIfInterrupted();
        const Step& step = plan[states.size()];
        StepState state{step.label(), true, ledger_.whyToDo(step, versionOf(step)), 0.0, false};
        progress_.begin(state.label, states.size() + 1, countUntil(plan, until));
        if (state.why.empty())
            log([&] { return step.label() + " was done already"; });
        else
            state.seconds = doStep(step, state.why);
        states.push_back(std::move(state));
    }
}

std::vector<StepState> RunFolder::explain(const std::string& until) {
    const Plan plan = planOf(settings_, known());
    std::vector<StepState> states;
    std::set<fs::path> changing;
    for (std::size_t i = 0; i < countUntil(plan, until); ++i) {
        const Step& step = plan[i];
        StepState state{step.label(), false, {}, 0.0, false};
        try {
            state.why = ledger_.whyToDo(step, versionOf(step));
        } catch (const std::runtime_error& error) {
            state.why = error.what();
        }
        state.isDone = state.why.empty();
        const auto changed = std::find_if(step.inputs.begin(), step.inputs.end(),
                                          [&](const fs::path& input) { return changing.count(input) > 0; });
        if (state.isDone && changed != step.inputs.end()) {
            state.isBehind = true;
            state.why = "its input " + changed->string() + " may change";
        }
        if (!state.why.empty())
            changing.insert(step.outputs.begin(), step.outputs.end());
        states.push_back(std::move(state));
    }
    return states;
}

} // namespace quarn
