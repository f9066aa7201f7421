// SPDX-License-Identifier: Apache-2.0
#include "quarn/pose/commands.h"

#include "openquarn_app/SceneFile.h"
#include "quarn/console/Log.h"
#include "quarn/console/UsageError.h"
#include "quarn/console/consoleOptions.h"
#include "quarn/console/interrupt.h"
#include "quarn/console/json.h"
#include "quarn/console/numberText.h"
#include "quarn/pose/sceneOrder.h"
#include "quarn/pose/targetAim.h"
#include "quarn/pose/targetCache.h"
#include "quarn/pose/targetFrames.h"
#include "quarn/scene/SceneSession.h"
#include "quarn/scene/meshes.h"
#include "quarn/scene/plugs.h"
#include "quarn/scene/training.h"

#include <CLI/CLI.hpp>

#include <cmath>
#include <iostream>
#include <limits>
#include <stdexcept>

namespace quarn {
namespace {

namespace fs = std::filesystem;

struct Options {
    SceneOptions scene;
    fs::path output;
    TargetFile file;
    std::string deformer;
    std::string geometry;
    std::optional<double> startFrame;
    AimOptions aim;
    Console console;
};

// the cache that the scene plays
struct Cache {
    fs::path path;
    std::size_t frames = 0;
    bool converted = false;
    TargetAim aim;
};

// beside the output, named after both, so that caches of two meshes or scenes do not meet
fs::path pathOfConverted(const Options& options, const WarpGeometry& geometry) {
    fs::path path = options.output;
    path.replace_filename(options.output.stem().string() + "." + geometry.name + "_target.npy");
    std::error_code missing;
    if (path == options.file.cache || fs::equivalent(path, options.file.cache, missing))
        throw std::runtime_error(path.string() + " would be overwritten by its own conversion: give the cache " +
                                 "another name");
    return path;
}

void warnOfJoined(const SceneFrames& frames, const Options& options, const WarpGeometry& geometry) {
    constexpr double agrees = 1e-5; // of the mesh's size: what single precision and a solver's noise give
    if (frames.largestDistance() > agrees * diagonalOf(restMesh(geometry)))
        options.console.warn("vertices of the cache that are one vertex of " + geometry.name + " are up to " +
                             numberText(frames.largestDistance()) + " apart; the first of each was taken");
}

Cache fittingCache(SceneSession& session, const Options& options, const Warp& warp, const WarpGeometry& geometry) {
    const Stage stage([&] { return "reading point cache " + options.file.cache.string() + " for " + geometry.name; });
    SceneFrames frames = openTargetFrames(options.file, geometry, options.console);
    TargetAim aim = aimTarget(session.host(), warp, geometry, frames, options.file, options.aim, options.console);
    if (frames.areTheFiles())
        return {options.file.cache, frames.frameCount(), false, std::move(aim)};
    const fs::path converted = pathOfConverted(options, geometry);
    writeSceneFrames(frames, converted, options.console);
    warnOfJoined(frames, options, geometry);
    return {converted, frames.frameCount(), true, std::move(aim)};
}

// while nobody has said which frames to export: those that the cache has
void exportFramesOf(const Warp& warp, double startFrame, std::size_t frames) {
    const HPlug first = warp.plug("exportStartFrame");
    const HPlug last = warp.plug("exportEndFrame");
    constexpr int unsetFirst = 1, unsetLast = 1000; // the node's defaults
    const double lastOfCache = startFrame + static_cast<double>(frames) - 1.0;
    const auto isFrame = [](double frame) { return std::abs(frame) <= std::numeric_limits<int>::max(); };
    if (wholeNumberOf(first) != unsetFirst || wholeNumberOf(last) != unsetLast || first.isDestination() ||
        last.isDestination() || !isFrame(startFrame) || !isFrame(lastOfCache))
        return;
    setNumber(first, std::ceil(startFrame));
    setNumber(last, std::max(std::ceil(startFrame), std::floor(lastOfCache)));
}

void warnOfShortCache(const Options& options, const Warp& warp, double startFrame, std::size_t frames) {
    const int first = wholeNumberOf(warp.plug("exportStartFrame"));
    const int last = wholeNumberOf(warp.plug("exportEndFrame"));
    const double lastOfCache = startFrame + static_cast<double>(frames) - 1.0;
    if (startFrame > first || lastOfCache < last)
        options.console.warn("the cache covers frames " + numberText(startFrame) + "-" + numberText(lastOfCache) +
                             ", and " + warp.name + " exports frames " + std::to_string(first) + "-" +
                             std::to_string(last) + ": its first and last frames are held beyond");
}

void printJson(const TargetReport& report, const Cache& cache, const Options& options, const std::string& geometry) {
    rapidjson::StringBuffer buffer;
    JsonWriter writer(buffer);
    writer.StartObject();
    writeText(writer, "scene", options.output.string());
    writeText(writer, "geometry", geometry);
    writeText(writer, "target", report.node);
    writeText(writer, "cache", cache.path.string());
    writeBool(writer, "converted", cache.converted);
    writeBool(writer, "replaced", report.replaced);
    writer.Key("frames");
    writer.Uint64(cache.frames);
    writer.Key("startFrame");
    writer.Double(report.startFrame);
    writeFit(writer, cache.aim.fit, cache.aim.context, cache.aim.isAligned);
    writer.EndObject();
    std::cout << buffer.GetString() << '\n';
}

void target(Options& options) {
    watchForInterrupt();
    options.file.cache = absolutePath(options.file.cache);
    options.output = absolutePath(options.output.empty() ? options.scene.scene : options.output);
    if (options.startFrame && !std::isfinite(*options.startFrame))
        throw UsageError("--start-frame is a finite number");
    if (options.file.restFrame && options.file.order != "rest")
        throw UsageError("--rest-frame goes with --order rest");
    SceneSession session(options.scene);
    const Warp warp = Warp::find(options.deformer);
    const WarpGeometry& geometry = warp.geometry(options.geometry);
    options.file.startFrame = options.startFrame.value_or(numberOf(warp.plug("exportStartFrame")));
    const Cache cache = fittingCache(session, options, warp, geometry);
    session.moveTo(options.output.parent_path()); // before the cache is named: its path counts from there
    const std::string named = OpenQuarn::pathForScene(cache.path, options.output.parent_path());
    const TargetReport report = connectTarget(warp, geometry, named, cache.aim.startFrame);
    setGoodTraining(warp.plug("train[" + std::to_string(geometry.index) + "]"));
    exportFramesOf(warp, report.startFrame, cache.frames);
    session.save(options.output);
    warnOfShortCache(options, warp, report.startFrame, cache.frames);
    if (options.console.json)
        printJson(report, cache, options, geometry.name);
    else
        std::cout << report.node << " plays " << cache.frames << " frames of " << cache.path.string() << " from frame "
                  << numberText(report.startFrame) << " on as the target of " << geometry.name
                  << (report.replaced ? ", instead of an earlier target\n" : "\n") << aimText(cache.aim);
}

} // namespace

void addTargetCommand(CLI::App& app) {
    const auto options = std::make_shared<Options>();
    CLI::App* command = app.add_subcommand("target", "Make a point cache the target of a deformer");
    addSceneOptions(*command, options->scene);
    command
        ->add_option("--cache", options->file.cache,
                     "The points, frame by frame: .npy, .npz, .pc2, .mdd or FILE.####.obj")
        ->required();
    command->add_option("-o,--output", options->output, "The scene to write; SCENE itself when not given");
    command->add_option("--deformer", options->deformer, "The neuralWarp node, where there are several");
    command->add_option("--geometry", options->geometry, "Index or mesh of the geometry, where there are several");
    command->add_option("--start-frame", options->startFrame,
                        "Time of the cache's first frame; the deformer's exportStartFrame when not given");
    command
        ->add_option(
            "--order", options->file.order,
            "Whose vertices the cache has: of the scene's mesh, of the file, or those that lie nearest at rest")
        ->check(CLI::IsMember({"scene", "file", "rest"}))
        ->capture_default_str();
    command->add_option("--rest-frame", options->file.restFrame,
                        "Frame of the scene at which the cache is at rest, for --order rest; its first when not given");
    addCacheSpaceOptions(*command, options->file.space);
    command->add_flag(
        "--align", options->aim.align,
        "Mend what a cache looks like that does not fit the skin: frames early or late, axes, unit, order");
    command->add_flag("--anyway", options->aim.anyway, "Take a cache that does not fit the skin as it is");
    addConsoleOptions(*command, options->console, true);
    command->callback([options] { target(*options); });
}

} // namespace quarn
