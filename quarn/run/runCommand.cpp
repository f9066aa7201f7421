// SPDX-License-Identifier: Apache-2.0
#include "quarn/console/UsageError.h"
#include "quarn/console/consoleOptions.h"
#include "quarn/console/interrupt.h"
#include "quarn/console/json.h"
#include "quarn/console/printable.h"
#include "quarn/run/RunFolder.h"
#include "quarn/run/commands.h"
#include "quarn/run/recipe.h"
#include "storage/readWholeFile.h"

#include <CLI/CLI.hpp>

#include <algorithm>
#include <iostream>
#include <type_traits>

namespace quarn {
namespace {

namespace fs = std::filesystem;

constexpr const char* targetFlag = "--target-command";

struct Options {
    RunSettings settings;
    fs::path recipe, folder;
    std::string until;
    bool allowCommands = false, explain = false;
    Console console;
};

bool has(const std::vector<StepState>& states, const char* step) {
    return std::any_of(states.begin(), states.end(),
                       [&](const StepState& state) { return state.label.rfind(step, 0) == 0; });
}

std::string json(const RunFolder& run, const std::vector<StepState>& states) {
    rapidjson::StringBuffer buffer;
    JsonWriter writer(buffer);
    writer.StartObject();
    writeText(writer, "folder", run.path().string());
    writer.Key("steps");
    writer.StartArray();
    for (const StepState& state : states) {
        writer.StartObject();
        writeText(writer, "step", state.label);
        writeBool(writer, "done", state.isDone);
        writeText(writer, "why", state.why);
        writer.Key("seconds");
        writer.Double(state.seconds);
        writer.EndObject();
    }
    writer.EndArray();
    writeText(writer, "report", has(states, "report") ? (run.path() / "report.html").string() : "");
    writer.EndObject();
    return std::string(buffer.GetString()) + "\n";
}

std::string explanation(const RunFolder& run, const std::vector<StepState>& states, bool hasTargets) {
    std::string text;
    for (const StepState& state : states)
        text += state.label + ": " +
                (state.why.empty() ? "done"
                 : state.isBehind  ? "done, but " + state.why
                                   : "to do, as " + state.why) +
                "\n";
    if (!run.facts().character)
        text += "and what follows from what the character has\n";
    else if (hasTargets && !has(states, "report"))
        text += "and what follows from that\n";
    return text;
}

// what a tool needs that is to make targets
std::string needed(const RunFolder& run, const RunSettings& settings) {
    const RunFacts facts = run.facts();
    std::string text = "the poses are there; what shapes the meshes should have in them is to be made:\n";
    const auto add = [&](const std::string& scene, const FrameSpan& frames) {
        text += "  " + (run.path() / (scene + ".glb")).string() + ": the skeleton and its keys, frames " +
                framesText(frames) + "; the scene is " + scene + ".json\n";
        for (const MeshFacts& mesh : facts.character->meshes)
            text += "  " + (run.path() / skinFile(scene, mesh.name)).string() + ": the skin of " + mesh.name +
                    ", <f4 [" + std::to_string(frames.count()) + ", " +
                    std::to_string(settings.order == "file" ? mesh.fileVertices : mesh.vertices) +
                    ", 3], a row a frame; targets are shaped alike\n";
    };
    add("poses", *facts.poses);
    if (facts.motion)
        add("motion", *facts.motion);
    const bool hasSeveral = facts.character->meshes.size() > 1;
    return text + "then the same command goes on, with --targets " + (hasSeveral ? "MESH=" : "") + "FILE" +
           (facts.motion ? std::string(" --motion-targets ") + (hasSeveral ? "MESH=" : "") + "FILE" : "") +
           " added; or with " + targetFlag + " PROGRAM\n";
}

std::string answer(const RunFolder& run, const Options& options, const std::vector<StepState>& states) {
    if (options.console.json)
        return json(run, states);
    if (options.explain)
        return explanation(run, states, options.settings.hasTargets());
    if (has(states, "report"))
        return storage::readWholeFile(run.path() / "table.txt", std::uint64_t{1} << 20U) + "report " +
               (run.path() / "report.html").string() + "\n";
    const bool isAtPoses = has(states, "skin") && !options.settings.hasTargets() && run.facts().poses;
    return isAtPoses ? needed(run, options.settings) : "";
}

void noteKept(const Options& options, const std::vector<StepState>& states) {
    const auto kept =
        std::count_if(states.begin(), states.end(), [](const StepState& state) { return state.why.empty(); });
    if (kept > 0)
        options.console.note(std::to_string(kept) + " of " + std::to_string(states.size()) +
                             " steps were done already");
}

void noteLeftOut(const Options& options, const RunFacts& facts) {
    if (!facts.character || !options.settings.hasTargets())
        return;
    for (const std::string& mesh : chooseMeshes(options.settings, *facts.character).leftOut)
        options.console.note(mesh + " has no targets, and gets no model");
}

void execute(Options& options) {
    watchForInterrupt();
    if (!options.until.empty() &&
        std::find(stepNames().begin(), stepNames().end(), options.until) == stepNames().end()) {
        std::string names;
        for (const std::string& name : stepNames())
            names += (names.empty() ? "" : ", ") + name;
        throw UsageError("there is no step \"" + options.until + "\"; steps are " + names);
    }
    RunFolder run(options.settings, options.folder, options.console);
    const std::vector<StepState> states = options.explain ? run.explain(options.until) : run.run(options.until);
    if (!options.explain) {
        noteKept(options, states);
        noteLeftOut(options, run.facts());
    }
    std::cout << printable(answer(run, options, states));
}

void addOptions(CLI::App& command, Options& options) {
    command.add_option("CHARACTER", options.settings.character, "The character: .gltf, .glb, .fbx or .dae");
    command.add_option("-o,--output", options.folder, "The folder to make, or to go on with")
        ->required()
        ->type_name("FOLDER");
    command.add_option("--recipe", options.recipe, "JSON: what flags say, under their names")->type_name("FILE");
    visitSettings([&](const char* name, auto member, const char* type, const char* help) {
        const std::string flag = std::string("--") + name;
        if constexpr (std::is_same_v<decltype(member), bool RunSettings::*>)
            command.add_flag(flag, options.settings.*member, help);
        else
            command.add_option(flag, options.settings.*member, help)->type_name(type)->allow_extra_args(false);
    });
    command.add_flag("--allow-commands", options.allowCommands, "Let a recipe start the program that it names");
    command.add_option("--until", options.until, "Stop behind this step")->type_name("STEP");
    command.add_flag("--explain", options.explain, "Do nothing; say what would be done, and why");
    command.footer(std::string("Instead of --targets, as the last of the flags:\n  ") + targetFlag +
                   " PROGRAM [ARG...]  A program that makes them; all words behind this are its own.\n" +
                   "                                     docs/run.md says what it is asked for.");
}

// whoever has put a flag there finds out before hours have passed
void noteSwallowed(const CLI::App& command, const Words& targetCommand, const Console& console) {
    for (const std::string& word : targetCommand)
        if (word.rfind("--", 0) == 0 && command.get_option_no_throw(word) != nullptr)
            console.note(word + " stands behind " + targetFlag + ", and is an argument of that program");
}

void takeSettings(const CLI::App& command, Options& options, const Words& targetCommand) {
    const fs::path here = fs::current_path();
    options.settings.targetCommand = targetCommand;
    resolve(options.settings, here);
    options.folder = (here / options.folder).lexically_normal();
    if (!options.folder.has_filename())
        options.folder = options.folder.parent_path();
    const auto isGiven = [&](const std::string& name) {
        return name == "target-command" ? !targetCommand.empty()
               : name == "character"    ? !options.settings.character.empty()
                                        : command.get_option("--" + name)->count() > 0;
    };
    if (!options.recipe.empty())
        readRecipe((here / options.recipe).lexically_normal(), options.settings, isGiven, options.allowCommands);
    check(options.settings);
}

} // namespace

std::vector<std::string> takeTargetCommand(int& argc, const char* const* argv) {
    const char* const* const end = argv + argc;
    if (argc < 2 || argv[1] != std::string("run"))
        return {};
    const char* const* const flag = std::find(argv, end, std::string(targetFlag));
    if (flag == end)
        return {};
    argc = static_cast<int>(flag - argv);
    if (flag + 1 == end)
        throw UsageError(std::string(targetFlag) + " needs a program, with its arguments behind it");
    return {flag + 1, end};
}

void addRunCommand(CLI::App& app, std::vector<std::string> targetCommand) {
    const auto options = std::make_shared<Options>();
    CLI::App* command = app.add_subcommand("run", "All steps from a character to a report, each done once");
    addOptions(*command, *options);
    addConsoleOptions(*command, options->console, true);
    command->callback([options, command, targetCommand = std::move(targetCommand)] {
        takeSettings(*command, *options, targetCommand);
        noteSwallowed(*command, targetCommand, options->console);
        execute(*options);
    });
}

} // namespace quarn
