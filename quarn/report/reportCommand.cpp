// SPDX-License-Identifier: Apache-2.0
#include "quarn/report/commands.h"

#include "quarn/console/Console.h"
#include "quarn/console/consoleOptions.h"
#include "quarn/console/interrupt.h"
#include "quarn/console/printable.h"
#include "quarn/report/Report.h"
#include "quarn/report/companions.h"
#include "quarn/scene/SceneSession.h"
#include "storage/WholeFile.h"

#include <CLI/CLI.hpp>

#include <iostream>
#include <stdexcept>
#include <thread>

namespace quarn {
namespace {

namespace fs = std::filesystem;

struct Options {
    RowWords words;
    Measuring measuring;
    CompanionOptions companions;
    std::string title;
    bool isOfPoses = false, isJudge = false;
    Console console;
};

// what is read is read before anything is measured
Row rowFor(const RowRequest& request, const Options& options) {
    std::optional<TrainingRecord> training;
    std::optional<Evaluation> evaluation;
    if (!request.training.empty())
        training = readTraining(request.training);
    if (!request.evaluation.empty())
        evaluation = readEvaluation(request.evaluation);
    Row row{measureRow(request, options.measuring, options.console), std::move(training), evaluation};
    row.judged = judge(row, request);
    return row;
}

std::string titleOf(const Options& options, const std::vector<RowRequest>& requests) {
    std::string title = options.title;
    if (title.empty())
        for (const RowRequest& request : requests)
            title += (title.empty() ? "" : ", ") + request.name;
    return title;
}

void write(const Report& report, const fs::path& folder, const std::string& json) {
    storage::writeWhole(folder / "report.json", json);
    storage::writeWhole(folder / "table.txt", printable(tableOf(report)));
    storage::writeWhole(folder / "report.html", pageOf(report));
}

void requireKept(const Report& report) {
    std::string missed;
    for (const Row& row : report.rows)
        if (!row.isKept())
            missed += (missed.empty() ? "" : " ") + row.measured.name + ": " + verdictOf(row);
    if (!missed.empty())
        throw std::runtime_error("more is left than asked for. " + missed);
}

void execute(Options& options) {
    watchForInterrupt();
    options.companions.folder = absolutePath(options.companions.folder);
    options.companions.plugins = options.measuring.plugins;
    storage::WholeFile::requirePossible(options.companions.folder / "report.html");
    const std::vector<RowRequest> requests = rowsOf(options.words);
    Report report{titleOf(options, requests),
                  !options.isOfPoses,
                  "quarn " QUARN_VERSION,
                  processorName(),
                  std::thread::hardware_concurrency(),
                  {}};
    for (const RowRequest& request : requests)
        report.rows.push_back(rowFor(request, options));
    std::vector<std::string> taken{"report"};
    for (Row& row : report.rows) {
        const std::string file = fileNameFor(row.measured.name, taken);
        addPictures(row, file, options.companions, options.console);
        addViewer(row, file, options.companions, options.console);
    }
    const std::string json = printable(jsonOf(report));
    write(report, options.companions.folder, json);
    if (options.console.json)
        std::cout << json;
    else
        std::cout << printable(tableOf(report) + "report " + (options.companions.folder / "report.html").string() +
                               "\n");
    if (options.isJudge)
        requireKept(report);
}

void addRowOptions(CLI::App& command, RowWords& words) {
    command.add_option("SCENE", words.scenes, "Scenes, each a row; NAME=SCENE names it")
        ->required()
        ->type_name("[NAME=]SCENE");
    const auto add = [&](const char* flag, std::vector<std::string>& list, const char* type, const char* help) {
        command.add_option(flag, list, help)->type_name(type)->allow_extra_args(false);
    };
    add("--deformer", words.deformers, "[NAME=]NODE", "The neuralWarp node, where there are several");
    add("--geometry", words.geometries, "[NAME=]INDEX|MESH", "Of the deformer, where it has several");
    add("--model", words.models, "[NAME=]MODEL", "Use this model of the deformer's modelRoot, switched on");
    add("--frames", words.frames, "[NAME=]A-B[xS]", "The deformer's export range by default");
    add("--training", words.trainings, "[NAME=]FOLDER", "The trainer's report of the model: its losses and settings");
    add("--evaluate", words.evaluations, "[NAME=]FILE", "What trainer evaluate --json said: zero deltas and basis");
    add("--limit-mean", words.means, "[NAME=]X",
        "The most that may be left in the mean: a part of before (0.06, 6%) or a distance (0.5mm)");
    add("--limit-max", words.maxima, "[NAME=]X", "The same of the largest distance");
}

void addCompanionOptions(CLI::App& command, CompanionOptions& options) {
    command.add_option("-o,--output", options.folder, "The folder of the report")->required()->type_name("FOLDER");
    command.add_option("--pictures", options.pictures, "Pictures of each row, the worst frame first")
        ->check(CLI::Range(0, 100))
        ->capture_default_str();
    command.add_option("--view", options.view, "Of pictures and viewer, as for quarn render")->type_name("VIEW");
    command.add_option("--range", options.range, "Of the colours of distances; a round one by default")
        ->type_name("MM")
        ->check(CLI::PositiveNumber);
    command.add_option("--render-option", options.renderOptions, "A word more for quarn render; may be repeated")
        ->type_name("WORD")
        ->allow_extra_args(false);
    command.add_flag_callback(
        "--no-viewer", [&options] { options.hasViewer = false; }, "No page to turn the character in a browser");
}

} // namespace

void addReportCommand(CLI::App& app) {
    const auto options = std::make_shared<Options>();
    CLI::App* command = app.add_subcommand("report", "Measure scenes against their targets, and write what was found");
    addRowOptions(*command, options->words);
    addCompanionOptions(*command, options->companions);
    command->add_option("--title", options->title, "What the report is called; the names of its rows by default");
    command->add_flag("--poses", options->isOfPoses, "Frames are poses that do not follow each other");
    command->add_flag("--judge", options->isJudge, "End with status 1 where a limit is not kept");
    command->add_option("--repeat", options->measuring.repeats, "Play so many times, and time all but the first")
        ->check(CLI::Range(1, 1'000'000))
        ->capture_default_str();
    command->add_option("--threads", options->measuring.threads, "Of evaluation; 0 for as many as there are")
        ->check(CLI::Range(0, 1024))
        ->capture_default_str();
    command->add_option("-p,--plugin", options->measuring.plugins, "Load a further plug-in first")
        ->type_name("PATH")
        ->allow_extra_args(false);
    addConsoleOptions(*command, options->console, true);
    addProgressOption(*command, options->console);
    command->callback([options] { execute(*options); });
}

} // namespace quarn
