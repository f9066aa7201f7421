// SPDX-License-Identifier: Apache-2.0
#include "quarn/play/commands.h"

#include "quarn/console/Console.h"
#include "quarn/console/StdoutAside.h"
#include "quarn/console/UsageError.h"
#include "quarn/console/consoleOptions.h"
#include "quarn/console/interrupt.h"
#include "quarn/console/printable.h"
#include "quarn/play/playReport.h"
#include "quarn/play/playing.h"
#include "quarn/scene/SceneSession.h"
#include "quarn/scene/Warp.h"
#include "quarn/scene/evaluator.h"
#include "quarn/scene/meshes.h"
#include "quarn/scene/plugs.h"
#include "quarn/scene/poseTexts.h"
#include "quarn/scene/units.h"
#include "quarn/scene/useModel.h"
#include "storage/CacheFormat.h"

#include <CLI/CLI.hpp>

#include <iostream>
#include <stdexcept>

namespace quarn {
namespace {

namespace fs = std::filesystem;

struct Options {
    SceneOptions scene;
    Console console;
    ModelOption model;
    GuardOption guard;
    std::string deformer, geometry, plug, frames, against;
    std::string order = "scene", evaluator = "cpu", device;
    CacheSpace space;
    PartOptions part;
    fs::path output, trace;
    bool overwrite = false, skipExisting = false;
    int repeats = 1;
    bool isAnySizeWritten = false;
    std::string targets = "frames";
    std::string clip;
    std::optional<double> allowedError;
};

// with --plug alone a scene needs no deformer
std::optional<Warp> warpFor(const Options& options) {
    const bool isNeeded = options.plug.empty() || !options.deformer.empty() || !options.model.name.empty();
    if (!isNeeded && nodesOfType("neuralWarp").empty())
        return {};
    return Warp::find(options.deformer);
}

HPlug targetOf(const Warp* warp, const WarpGeometry* geometry, const std::string& against) {
    if (against != "target")
        return findPlug(against);
    if (geometry == nullptr)
        throw std::runtime_error("--against target compares with the target of a deformer, and none is played");
    if (geometry->target.isNull())
        throw std::runtime_error(geometry->name + " has no target: connect one into " + warp->name +
                                 ".targetGeometry[" + std::to_string(geometry->index) + "], or let quarn target do it");
    return geometry->target;
}

void addComparison(PlayPlan& plan, const Options& options, const Warp* warp, const WarpGeometry* geometry) {
    if (options.against.empty())
        return;
    plan.against = targetOf(warp, geometry, options.against);
    if (geometry == nullptr)
        return;
    if (options.plug.empty())
        plan.before = geometry->input;
    if (!geometry->original.source().isNull())
        readPoints(geometry->original, plan.rest.emplace());
}

void addOrder(PlayPlan& plan, const std::string& order) {
    if (order == "file")
        plan.order = VertexOrder::ofFile(plan.meshName, polygonsOf(plan.mesh).vertexCount);
}

// none for a target a frame
std::optional<double> allowedErrorOf(const Options& options, const FrameRange& frames) {
    constexpr double usual = 0.05;
    const bool isFitted = options.targets == "fit";
    if (isFitted && (options.output.extension() != ".glb" || !isAnimatedFile(options.output, frames.count())))
        throw UsageError("--targets fit goes with -o FILE.glb and several frames");
    if (!isFitted && options.allowedError)
        throw UsageError("--error goes with --targets fit");
    return isFitted ? std::optional(options.allowedError.value_or(usual)) : std::nullopt;
}

// what is played begins with this mesh of a file
HObject meshOf(const PlayPlan& plan, const WarpGeometry* geometry) {
    return meshBehind(geometry != nullptr ? geometry->input : plan.mesh);
}

// what a character was imported from is not replaced by a clip of it
void requireOther(const fs::path& output) {
    std::error_code none;
    if (hasSourceFile() && fs::equivalent(sourceFile(), output, none))
        throw std::runtime_error(output.string() + " is the character itself; name another file for the clip");
}

// the file that a clip is put into; with a note where there could be one and is none
void addSource(PlayPlan& plan, const Options& options, const WarpGeometry* geometry) {
    const bool isClip = plan.output.extension() == ".glb" && isAnimatedFile(plan.output, plan.frames.count());
    if (!isClip && !options.clip.empty())
        throw UsageError("--clip goes with -o FILE.glb and several frames");
    const bool isAsked = options.clip == "character";
    if (isAsked && !options.space.isTheScenes())
        throw UsageError("--axes and --scale go with --clip mesh: the character's file has its own space");
    if (isClip)
        requireOther(plan.output);
    if (!isClip || options.clip == "mesh" || (!isAsked && !hasSourceFile()))
        return;
    try {
        if (!options.space.isTheScenes())
            throw std::runtime_error("--axes and --scale are for the mesh alone");
        plan.source = findClipSource(meshOf(plan, geometry), vertexCountOf(plan.mesh));
        plan.order = VertexOrder();
    } catch (const Interrupted&) {
        throw;
    } catch (const std::runtime_error& why) {
        if (isAsked)
            throw std::runtime_error("the motion cannot be put into the character's file: " + std::string(why.what()));
        options.console.note("written is the mesh alone, without materials, UVs, pictures, skin and other meshes of "
                             "the character: " +
                             std::string(why.what()) + ". --clip mesh says that this is meant");
    }
}

PlayPlan planFor(const Options& options) {
    chooseEvaluator(options.evaluator, options.device);
    const std::optional<Warp> warp = warpFor(options);
    const bool isDeformed = options.plug.empty() || !options.geometry.empty() || !options.model.name.empty();
    const WarpGeometry* const geometry = warp && isDeformed ? &warp->geometry(options.geometry) : nullptr;
    PlayPlan plan;
    plan.mesh = options.plug.empty() ? geometry->output : findPlug(options.plug);
    plan.frames = framesToPlay(options.frames, warp ? &*warp : nullptr);
    plan.part = options.part;
    plan.scene = absolutePath(options.scene.scene);
    plan.repeats = options.repeats;
    plan.replacesBegun = options.overwrite;
    plan.leavesExisting = options.skipExisting;
    plan.output = options.output;
    plan.space = options.space;
    plan.meshName = geometry != nullptr ? geometry->name : nodeName(plan.mesh.node());
    plan.allowedError = allowedErrorOf(options, plan.frames);
    plan.isAnySizeWritten = options.isAnySizeWritten;
    plan.trace = options.trace;
    plan.isOnGpu = options.evaluator == "gpu";
    plan.model = geometry != nullptr && options.model.isGiven() ? chooseModel(*warp, *geometry, options.model)
                                                                : chooseModel(plan.mesh, options.model);
    if (options.guard.isOn)
        plan.guardWidth = options.guard.width;
    addComparison(plan, options, warp ? &*warp : nullptr, geometry);
    addOrder(plan, options.order);
    addSource(plan, options, geometry);
    return plan;
}

void play(Options& options) {
    watchForInterrupt();
    options.output = absolutePath(options.output);
    options.trace = absolutePath(options.trace);
    std::string answer;
    {
        const StdoutAside aside;
        SceneSession session(options.scene);
        const PlayPlan plan = planFor(options);
        const double meters = metersPerUnit();
        const PlayResult result = playFrames(session, plan, options.console);
        answer = options.console.json ? playJson(result, plan, meters) : playText(result, plan, meters);
    }
    std::cout << printable(answer);
}

void bake(Options& options) {
    watchForInterrupt();
    options.output = absolutePath(options.output);
    if (!storage::cacheFormatOf(options.output))
        throw UsageError("\"" + options.output.string() + "\" is no point cache: its name ends in " +
                         storage::cacheEndings + ". quarn play writes meshes");
    const StdoutAside aside;
    SceneSession session(options.scene);
    const PlayPlan plan = planFor(options);
    const PlayResult result = playFrames(session, plan, options.console);
    const std::string kept =
        result.framesKept > 0 ? ", " + std::to_string(result.framesKept) + " of them in an earlier run" : "";
    const std::string skipped =
        result.framesSkipped > 0 ? "; of " + std::to_string(result.framesSkipped) + " others the files were there" : "";
    options.console.note("wrote " + std::to_string(result.framesKept + result.times.count()) + " frames of " +
                         std::to_string(result.vertexCount) + " vertices to " + options.output.string() + kept +
                         skipped);
    if (!plan.model.note.empty())
        options.console.note(plan.model.note);
    noteGuard(options.console, result.guard, options.guard.width);
    notePoses(options.console, result.poses);
}

void addFrameOptions(CLI::App& command, Options& options, bool makesParts) {
    command.add_option("--frames", options.frames, "As 5, 1-100 or 1-100x5; the deformer's export range by default");
    addPartOptions(command, options.part, makesParts);
    command.add_flag("--overwrite", options.overwrite, "Begin a .npy again that was begun with another set-up");
    command.add_flag("--skip-existing", options.skipExisting,
                     "With a file for each frame: leave out the frames whose file is there");
    command.add_option("--order", options.order, "Order of written vertices: scene, or file as they were imported")
        ->check(CLI::IsMember({"scene", "file"}))
        ->capture_default_str();
    addCacheSpaceOptions(command, options.space);
}

void addClipOptions(CLI::App& command, Options& options) {
    command.add_flag("--anyway", options.isAnySizeWritten, "Write also a .usda or .glb of more than 2 GB");
    command
        .add_option("--targets", options.targets,
                    "Morph targets of a .glb of all frames: one for each frame, or as few as --error allows")
        ->check(CLI::IsMember({"frames", "fit"}))
        ->capture_default_str();
    command
        .add_option("--error", options.allowedError,
                    "Millimetres that a vertex may be off with --targets fit: 0.05 by default")
        ->check(CLI::PositiveNumber)
        ->type_name("MM");
    command
        .add_option("--clip", options.clip,
                    "What a .glb of all frames is: the glTF file of the character with the motion in it (the default "
                    "where it is one), or the mesh alone")
        ->check(CLI::IsMember({"character", "mesh"}));
}

void addMeasureOptions(CLI::App& command, Options& options) {
    command.add_option("--against", options.against, "Compare with this mesh plug, or with the deformer's target")
        ->type_name("PLUG|target");
    command.add_option("--evaluator", options.evaluator, "Where deformers run")
        ->check(CLI::IsMember({"cpu", "gpu"}))
        ->capture_default_str();
    command
        .add_option("--device", options.device,
                    "OpenCL device: its number or a part of its name (quarn info --devices)")
        ->type_name("DEVICE");
    command.add_option("--profile", options.trace, "Record, and write a trace for Perfetto or chrome://tracing")
        ->type_name("FILE");
    command.add_option("--repeat", options.repeats, "Play so many times, and time all but the first")
        ->check(CLI::Range(1, 1'000'000))
        ->capture_default_str();
}

} // namespace

void addPlayCommand(CLI::App& app) {
    const auto options = std::make_shared<Options>();
    CLI::App* command = app.add_subcommand("play", "Play a deformed mesh: time it, compare it, write its frames");
    addSceneOptions(*command, options->scene);
    command->add_option("--deformer", options->deformer, "The neuralWarp node, where there are several");
    command->add_option("--geometry", options->geometry, "Index or name of the mesh, where it deforms several");
    command->add_option("--plug", options->plug, "Play this mesh plug instead of what the deformer gives out");
    addModelOptions(*command, options->model);
    addGuardOptions(*command, options->guard);
    command
        ->add_option("-o,--output", options->output,
                     "FILE.npy, .npz, .pc2, .mdd, .usda or .glb for all frames; FILE.####.obj, .ply, .gltf or .glb")
        ->type_name("FILE");
    addClipOptions(*command, *options);
    addFrameOptions(*command, *options, false);
    addMeasureOptions(*command, *options);
    addConsoleOptions(*command, options->console, true);
    addProgressOption(*command, options->console);
    command->callback([options] { play(*options); });
}

void addBakeCommand(CLI::App& app) {
    const auto options = std::make_shared<Options>();
    CLI::App* command = app.add_subcommand("bake", "Write a mesh plug, frame by frame, to a point cache");
    addSceneOptions(*command, options->scene);
    command->add_option("PLUG", options->plug, "The mesh, as skin.outputGeom[0]")->required();
    command
        ->add_option("-o,--output", options->output,
                     "The point cache to write: .npy, .npz, .pc2, .mdd or FILE.####.obj")
        ->type_name("FILE")
        ->required();
    addModelOptions(*command, options->model);
    addGuardOptions(*command, options->guard);
    addFrameOptions(*command, *options, true);
    addConsoleOptions(*command, options->console, false);
    addProgressOption(*command, options->console);
    command->callback([options] { bake(*options); });
}

} // namespace quarn
