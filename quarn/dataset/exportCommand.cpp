// SPDX-License-Identifier: Apache-2.0
#include "quarn/console/consoleOptions.h"
#include "quarn/console/interrupt.h"
#include "quarn/console/json.h"
#include "quarn/dataset/commands.h"
#include "quarn/dataset/exportControls.h"
#include "quarn/dataset/exportDatasets.h"
#include "quarn/scene/targetCheck.h"

#include <CLI/CLI.hpp>

#include <iostream>

namespace quarn {
namespace {

void printJson(const std::vector<ExportAnswer>& answers) {
    rapidjson::StringBuffer buffer;
    JsonWriter writer(buffer);
    writer.StartArray();
    for (const ExportAnswer& answer : answers) {
        writer.StartObject();
        writeText(writer, "geometry", answer.geometry);
        writeText(writer, "folder", answer.folder.string());
        writeCount(writer, "rows", answer.rows);
        writeCount(writer, "rowsBefore", answer.rowsBefore);
        writeCount(writer, "rowsRepeated", answer.rowsRepeated);
        writeCount(writer, "controls", answer.controls);
        writeCount(writer, "vertices", answer.vertices);
        writeCount(writer, "bytes", answer.bytes);
        FitContext context;
        context.metersPerUnit = answer.metersPerUnit;
        writeFit(writer, answer.fit, context, false);
        writeChoice(writer, answer.choice, answer.metersPerUnit);
        writer.EndObject();
    }
    writer.EndArray();
    std::cout << buffer.GetString() << '\n';
}

void printText(const std::vector<ExportAnswer>& answers) {
    for (const ExportAnswer& answer : answers) {
        if (answer.choice)
            std::cout << choiceText(*answer.choice, answer.geometry, answer.metersPerUnit);
        std::cout << answer.geometry << ": " << answer.rows << " rows of " << answer.controls << " controls and "
                  << answer.vertices << " vertices, " << answer.bytes << " bytes, in " << answer.folder.string()
                  << '\n';
        FitContext context;
        context.metersPerUnit = answer.metersPerUnit;
        if (answer.fit)
            std::cout << "its target is " << distanceText(answer.fit->asItIs, answer.fit->diagonal, context) << '\n';
    }
}

struct Options : ExportOptions {
    bool controlsOnly = false;
};

void printControls(const ControlsAnswer& answer, bool asJson) {
    if (!asJson) {
        std::cout << answer.rows << " rows of " << answer.controls << " controls in " << answer.folder.string() << '\n';
        return;
    }
    rapidjson::StringBuffer buffer;
    JsonWriter writer(buffer);
    writer.StartObject();
    writeText(writer, "folder", answer.folder.string());
    writeCount(writer, "rows", answer.rows);
    writeCount(writer, "controls", answer.controls);
    writer.EndObject();
    std::cout << buffer.GetString() << '\n';
}

void execute(const Options& options) {
    watchForInterrupt();
    if (options.controlsOnly)
        return printControls(exportControls(options), options.console.json);
    const std::vector<ExportAnswer> answers = exportDatasets(options);
    if (options.console.json)
        printJson(answers);
    else
        printText(answers);
}

} // namespace

void addExportCommand(CLI::App& app) {
    const auto options = std::make_shared<Options>();
    CLI::App* command = app.add_subcommand("export", "Write training data: control values and deltas, frame by frame");
    addSceneOptions(*command, options->scene);
    command
        ->add_option("-o,--output", options->output,
                     "The folder to make; of several geometries, a folder of folders [trainingDataRoot and "
                     "trainingDataName of the deformer]")
        ->type_name("FOLDER");
    command->add_option("--deformer", options->deformer, "The deformer [the only one]")->type_name("NAME");
    command->add_option("--geometry", options->geometry, "One of its geometries [all that have a target]")
        ->type_name("INDEX|NAME");
    command->add_option("--frames", options->frames, "[exportStartFrame to exportEndFrame of the deformer]")
        ->type_name("A-B[xS]");
    addPartOptions(*command, options->part, true);
    CLI::Option* smoothing =
        command
            ->add_option("--smoothing", options->smoothing,
                         "auto: compare kinds of deltas on the frames, and take the best [deltaMode and "
                         "smoothingIterations of export[i]]")
            ->type_name("auto")
            ->check(CLI::IsMember({"auto"}));
    command->add_option("--like", options->like, "Deltas of the same kind as those of this data set")
        ->type_name("FOLDER")
        ->excludes(smoothing);
    command
        ->add_flag("--controls-only", options->controlsOnly,
                   "No deltas: controls.npy, frames.npy and the names, before there are targets "
                   "[trainingDataRoot/DEFORMER.controls]")
        ->excludes(smoothing)
        ->excludes("--of")
        ->excludes("--preroll");
    command->add_flag("--anyway", options->anyway, "Export a target that does not fit the skin as well");
    command->add_flag("--overwrite", options->overwrite, "Replace another data set, or give up a begun one");
    addConsoleOptions(*command, options->console, true);
    addProgressOption(*command, options->console);
    command->callback([options] { execute(*options); });
}

} // namespace quarn
