// SPDX-License-Identifier: Apache-2.0
#include "quarn/console/UsageError.h"
#include "quarn/console/consoleOptions.h"
#include "quarn/console/printable.h"
#include "quarn/import/commands.h"
#include "quarn/import/importCharacter.h"

#include <CLI/CLI.hpp>

#include <iostream>
#include <limits>

namespace quarn {
namespace {

struct Options : ImportOptions {
    std::string limitsOf = "animation";
    Console console;
};

void addFiles(CLI::App& command, Options& options) {
    command.add_option("FILE", options.file, "The character: .gltf, .glb, .fbx or .dae")->required();
    command.add_option("-o,--output", options.output, "The scene file to write")->required()->type_name("SCENE");
    command.add_option("--parents", options.parents, "JSON: {\"child joint\": \"parent joint\"}")->type_name("FILE");
    command.add_option("-p,--plugin", options.plugins, "Load a further plug-in first; may be repeated")
        ->type_name("PATH")
        ->allow_extra_args(false);
    command.add_option("--meters-per-unit", options.metersPerUnit, "Instead of what the file says");
}

void addAnimationFlags(CLI::App& command, Options& options) {
    command.add_option("--fps", options.framesPerSecond, "Frames of a second")->capture_default_str();
    command
        .add_option("--animation", options.animations,
                    "The animation to take, or all; may be repeated: they lie one after another. Default the first")
        ->type_name("NAME")
        ->allow_extra_args(false);
    command.add_flag("--no-animation", options.noAnimation, "No curves; limits of poses still come from the animation");
}

void addWarpFlags(CLI::App& command, Options& options) {
    CLI::App& flags = *command.add_option_group("Deformer");
    CLI::Option* warp =
        flags.add_flag("--neural-warp", options.neuralWarp, "Set a deformer up behind the skins, with controls");
    const auto add = [&](const char* name, auto& value, const char* help) {
        return flags.add_option(name, value, help)->needs(warp);
    };
    add("--controls", options.warp.controls, "double-axis (default), ortho, quaternion or euler")
        ->check(CLI::IsMember({"double-axis", "ortho", "quaternion", "euler"}));
    add("--limits", options.limits,
        "JSON: {\"joint\": {\"rotateX\": [least, largest], ...}, \"slider\": [least, largest]}, in degrees")
        ->type_name("FILE");
    add("--limits-from", options.limitsOf,
        "Without --limits: those of the animation that is taken (default), of all, or of none")
        ->check(CLI::IsMember({"animation", "all", "none"}))
        ->excludes("--limits");
    add("--limits-margin", options.limitsMargin, "More on both sides of what animations do, in parts of the range")
        ->check(CLI::Range(0.0, 10.0))
        ->excludes("--limits");
    add("--write-limits", options.writtenLimits, "Write the limits as a file for --limits, to be edited")
        ->type_name("FILE");
    flags.add_flag("!--no-morph-controls", options.morphControls, "No controls of the weights of morph targets")
        ->needs(warp);
    flags.add_flag("--with-roots", options.withRoots, "Controls also of the joints that place the character")
        ->needs(warp);
    add("--samples", options.warp.samples, "Poses to sample")->check(CLI::Range(1, std::numeric_limits<int>::max()));
    add("--activation-rate", options.warp.activationRate, "Part of the angles that a sample moves")
        ->check(CLI::Range(0.0, 1.0));
    add("--model-root", options.warp.modelRoot, "Folder of the models, from the scene's folder; default models")
        ->type_name("DIR");
    add("--delta-mode", options.warp.deltaMode, "surface (default) or offset")
        ->check(CLI::IsMember({"surface", "offset"}));
    add("--smoothing", options.warp.smoothing, "Smoothing passes before deltas are measured")
        ->check(CLI::Range(0, 100));
}

void requireAbove0(const char* flag, double value) {
    if (!(value > 0.0 && value <= std::numeric_limits<double>::max()))
        throw UsageError(std::string(flag) + " must be a number above 0");
}

void execute(Options& options) {
    options.limitsFrom = options.limitsOf == "all"    ? LimitsFrom::all
                         : options.limitsOf == "none" ? LimitsFrom::none
                                                      : LimitsFrom::animation;
    requireAbove0("--fps", options.framesPerSecond);
    requireAbove0("--meters-per-unit", options.metersPerUnit.value_or(1.0));
    const ImportReport report = importCharacter(options);
    for (const std::string& warning : report.warnings)
        options.console.warn(warning);
    for (const std::string& note : report.notes)
        options.console.note(note);
    std::cout << printable(options.console.json ? reportJson(report) : reportText(report));
}

} // namespace

void addImportCommand(CLI::App& app) {
    const auto options = std::make_shared<Options>();
    CLI::App* command = app.add_subcommand("import", "Make a scene of a rigged character");
    addFiles(*command, *options);
    addAnimationFlags(*command, *options);
    addWarpFlags(*command, *options);
    addConsoleOptions(*command, options->console, true);
    command->callback([options] { execute(*options); });
}

} // namespace quarn
