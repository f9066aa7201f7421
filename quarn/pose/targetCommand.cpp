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
#include "quarn/pose/skinCache.h"
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
    fs::path target, skin; ///< caches, one of them at least
    TargetFile file;       ///< what is said of both
    std::string deformer;
    std::string geometry;
    std::optional<double> startFrame;
    AimOptions aim;
    Console console;
};

// a cache that the scene plays, and the node that plays it
struct Cache {
    fs::path path;
    std::size_t frames = 0;
    bool converted = false;
    TargetAim aim;
    CacheReport node;
};

const char* nameOf(CacheRole role) {
    return role == CacheRole::skin ? "skin" : "target";
}

// beside the output, named after both, so that caches of two meshes or scenes do not meet
fs::path pathOfConverted(const Options& options, const WarpGeometry& geometry, CacheRole role) {
    fs::path path = options.output;
    path.replace_filename(options.output.stem().string() + "." + geometry.name + "_" + nameOf(role) + ".npy");
    for (const fs::path& given : {options.target, options.skin})
        if (std::error_code missing; path == given || fs::equivalent(path, given, missing))
            throw std::runtime_error(path.string() + " would be overwritten by " +
                                     (given == options.file.cache ? "its own conversion" : "a conversion") +
                                     ": give the cache another name");
    return path;
}

void warnOfJoined(const SceneFrames& frames, const Options& options, const WarpGeometry& geometry) {
    constexpr double agrees = 1e-5; // of the mesh's size: what single precision and a solver's noise give
    if (frames.largestDistance() > agrees * diagonalOf(restMesh(geometry)))
        options.console.warn("vertices of the cache that are one vertex of " + geometry.name + " are up to " +
                             numberText(frames.largestDistance()) + " apart; the first of each was taken");
}

Cache fittingCache(SceneSession& session, const Options& options, const Warp& warp, const WarpGeometry& geometry,
                   CacheRole role) {
    const Stage stage([&] { return "reading point cache " + options.file.cache.string() + " for " + geometry.name; });
    SceneFrames frames = openTargetFrames(options.file, geometry, options.console);
    TargetAim aim = aimCache(session.host(), warp, geometry, frames, options.file, role, options.aim, options.console);
    if (frames.areTheFiles())
        return {options.file.cache, frames.frameCount(), false, std::move(aim), {}};
    const fs::path converted = pathOfConverted(options, geometry, role);
    writeSceneFrames(frames, converted, options.console);
    warnOfJoined(frames, options, geometry);
    return {converted, frames.frameCount(), true, std::move(aim), {}};
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

void warnOfShortCache(const Options& options, const Warp& warp, const Cache& cache, CacheRole role) {
    const int first = wholeNumberOf(warp.plug("exportStartFrame"));
    const int last = wholeNumberOf(warp.plug("exportEndFrame"));
    const double firstOfCache = cache.node.startFrame;
    const double lastOfCache = firstOfCache + static_cast<double>(cache.frames) - 1.0;
    if (firstOfCache > first || lastOfCache < last)
        options.console.warn(std::string("the ") + (role == CacheRole::skin ? "skin's " : "") + "cache covers frames " +
                             numberText(firstOfCache) + "-" + numberText(lastOfCache) + ", and " + warp.name +
                             " exports frames " + std::to_string(first) + "-" + std::to_string(last) +
                             ": its first and last frames are held beyond");
}

// once the scene is where it is to be saved: paths count from there
std::string nameInScene(const Cache& cache, const Options& options) {
    return OpenQuarn::pathForScene(cache.path, options.output.parent_path());
}

// what targets are compared with from then on
Cache takeSkin(SceneSession& session, Options& options) {
    const Warp warp = Warp::find(options.deformer);
    const WarpGeometry& geometry = warp.geometry(options.geometry);
    options.file.cache = options.skin;
    Cache cache = fittingCache(session, options, warp, geometry, CacheRole::skin);
    cache.node = connectSkin(warp, geometry, cache.path.string(), cache.aim.startFrame);
    return cache;
}

// while the scene is where it was
Cache readTarget(SceneSession& session, Options& options, const Warp& warp, const WarpGeometry& geometry) {
    options.file.cache = options.target;
    return fittingCache(session, options, warp, geometry, CacheRole::target);
}

void takeTarget(Cache& cache, const Options& options, const Warp& warp, const WarpGeometry& geometry) {
    cache.node = connectTarget(warp, geometry, nameInScene(cache, options), cache.aim.startFrame);
    setGoodTraining(warp.plug("train[" + std::to_string(geometry.index) + "]"));
    exportFramesOf(warp, cache.node.startFrame, cache.frames);
}

void writeCache(JsonWriter& writer, const Cache& cache, const char* nodeKey) {
    writeText(writer, nodeKey, cache.node.node);
    writeText(writer, "cache", cache.path.string());
    writeBool(writer, "converted", cache.converted);
    writeBool(writer, "replaced", cache.node.replaced);
    writer.Key("frames");
    writer.Uint64(cache.frames);
    writer.Key("startFrame");
    writer.Double(cache.node.startFrame);
    writeFit(writer, cache.aim.fit, cache.aim.context, cache.aim.isAligned);
}

void printJson(const std::optional<Cache>& skin, const std::optional<Cache>& target, const Options& options,
               const std::string& geometry) {
    rapidjson::StringBuffer buffer;
    JsonWriter writer(buffer);
    writer.StartObject();
    writeText(writer, "scene", options.output.string());
    writeText(writer, "geometry", geometry);
    if (target)
        writeCache(writer, *target, "target");
    if (skin) {
        writer.Key("skin");
        writer.StartObject();
        writeCache(writer, *skin, "node");
        writer.EndObject();
    }
    writer.EndObject();
    std::cout << buffer.GetString() << '\n';
}

void printText(const Cache& cache, CacheRole role, const std::string& geometry) {
    std::cout << cache.node.node << " plays " << cache.frames << " frames of " << cache.path.string() << " from frame "
              << numberText(cache.node.startFrame) << " on as the " << nameOf(role) << " of " << geometry
              << (cache.node.replaced ? std::string(", instead of an earlier ") + nameOf(role) : std::string()) << '\n'
              << aimText(cache.aim);
}

void check(const Options& options) {
    if (options.target.empty() && options.skin.empty())
        throw UsageError("nothing is given: --cache FILE for a target, --skin FILE for a skin, or both");
    if (options.startFrame && !std::isfinite(*options.startFrame))
        throw UsageError("--start-frame is a finite number");
    if (options.file.restFrame && options.file.order != "rest")
        throw UsageError("--rest-frame goes with --order rest");
}

void target(Options& options) {
    watchForInterrupt();
    check(options);
    for (fs::path* cache : {&options.target, &options.skin})
        if (!cache->empty())
            *cache = absolutePath(*cache);
    options.output = absolutePath(options.output.empty() ? options.scene.scene : options.output);
    SceneSession session(options.scene);
    options.file.startFrame =
        options.startFrame.value_or(numberOf(Warp::find(options.deformer).plug("exportStartFrame")));
    std::optional<Cache> skin, target;
    if (!options.skin.empty())
        skin = takeSkin(session, options);
    const Warp warp = Warp::find(options.deformer);
    const WarpGeometry& geometry = warp.geometry(options.geometry);
    if (!options.target.empty())
        target = readTarget(session, options, warp, geometry);
    session.moveTo(options.output.parent_path());
    if (skin)
        setText(plugOf(findNode(skin->node.node), "cacheFile"), nameInScene(*skin, options));
    if (target)
        takeTarget(*target, options, warp, geometry);
    session.save(options.output);
    for (const auto& [role, cache] : {std::pair(CacheRole::skin, &skin), std::pair(CacheRole::target, &target)})
        if (*cache)
            warnOfShortCache(options, warp, **cache, role);
    if (options.console.json)
        return printJson(skin, target, options, geometry.name);
    if (skin)
        printText(*skin, CacheRole::skin, geometry.name);
    if (target)
        printText(*target, CacheRole::target, geometry.name);
}

} // namespace

void addTargetCommand(CLI::App& app) {
    const auto options = std::make_shared<Options>();
    CLI::App* command = app.add_subcommand("target", "Make point caches the target and the skin of a deformer");
    addSceneOptions(*command, options->scene);
    command
        ->add_option("--cache", options->target, "The target, frame by frame: .npy, .npz, .pc2, .mdd or FILE.####.obj")
        ->type_name("FILE");
    command->add_option("--skin", options->skin, "The skin, likewise: in the place of what the scene's joints make")
        ->type_name("FILE");
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
    addProgressOption(*command, options->console);
    command->callback([options] { target(*options); });
}

} // namespace quarn
