// SPDX-License-Identifier: Apache-2.0
#include "quarn/pose/commands.h"

#include "quarn/console/Log.h"
#include "quarn/console/UsageError.h"
#include "quarn/console/consoleOptions.h"
#include "quarn/console/interrupt.h"
#include "quarn/console/json.h"
#include "quarn/console/numberText.h"
#include "quarn/pose/keyPoses.h"
#include "quarn/pose/refinePoses.h"
#include "quarn/pose/samplePoses.h"
#include "quarn/pose/writePoses.h"
#include "quarn/scene/SceneSession.h"
#include "quarn/scene/plugs.h"

#include <CLI/CLI.hpp>

#include <cmath>
#include <iostream>
#include <stdexcept>

namespace quarn {
namespace {

struct Options {
    SceneOptions scene;
    std::filesystem::path output;
    std::string deformer;
    SampleOptions sampling;
    std::string from = "limits";
    RefineOptions refining;
    std::filesystem::path keys;
    std::string others = "rest";
    PosesFileOptions written;
    Console console;
};

void writeFrames(JsonWriter& writer, int first, int last) {
    writer.Key("firstFrame");
    writer.Int(first);
    writer.Key("lastFrame");
    writer.Int(last);
}

std::string frames(int first, int last) {
    return "frames " + std::to_string(first) + "-" + std::to_string(last);
}

// "written": what a file of poses holds, where one was written
void writeFile(JsonWriter& writer, const std::optional<PosesFileReport>& file) {
    if (!file)
        return;
    writer.Key("written");
    writer.StartObject();
    writeText(writer, "file", file->file.string());
    writeCount(writer, "frames", file->frames);
    writeCount(writer, "joints", file->joints);
    writeCount(writer, "plugs", file->plugs);
    writeCount(writer, "meshes", file->meshes);
    writer.Key("sceneFirstFrame");
    writer.Int(file->sceneFirst);
    writeText(writer, "liesAt", file->place);
    writer.EndObject();
}

void writeReport(JsonWriter& writer, const SampleReport& report, const Options& options) {
    writeText(writer, "collector", report.collector);
    writeCount(writer, "poses", report.poses);
    writeCount(writer, "values", report.values);
    writeCount(writer, "fromLimits", report.fromLimits);
    writeCount(writer, "fromAnimation", report.fromAnimation);
    writeCount(writer, "drawnAgain", report.drawnAgain);
    writeCount(writer, "framesLeftOut", report.framesLeftOut);
    writeBool(writer, "complete", !report.asked);
    writer.Key("seed");
    writer.Uint64(options.sampling.seed);
    writeFrames(writer, report.firstFrame, report.lastFrame);
}

void printText(const SampleReport& report) {
    std::cout << report.poses << " poses of " << report.values << " values in "
              << frames(report.firstFrame, report.lastFrame) << ": " << report.fromLimits
              << " from limits, the default pose included, " << report.fromAnimation << " from animation; "
              << report.drawnAgain << " drawn again and " << report.framesLeftOut
              << " frames left out, being near another\n";
}

void writeReport(JsonWriter& writer, const RefineReport& report, const Options& options) {
    writeText(writer, "collector", report.collector);
    writeCount(writer, "poses", report.known + report.added.size());
    writeCount(writer, "values", report.values);
    writeCount(writer, "known", report.known);
    writer.Key("seed");
    writer.Uint64(options.refining.seed);
    writeFrames(writer, report.firstFrame, report.lastFrame);
    writer.Key("candidates");
    writer.StartObject();
    writeCount(writer, "count", report.candidates);
    writer.Key("disagreementMm");
    writer.Double(report.candidatesMm);
    writer.EndObject();
    writer.Key("added");
    writer.StartArray();
    for (const AddedPose& pose : report.added) {
        writer.StartObject();
        writer.Key("frame");
        writer.Int(pose.frame);
        writer.Key("disagreementMm");
        writer.Double(pose.mm);
        writer.Key("distance");
        writer.Double(pose.distance);
        writeCount(writer, "atLimits", pose.atLimits);
        writer.EndObject();
    }
    writer.EndArray();
}

void printText(const RefineReport& report) {
    double mm = 0.0;
    for (const AddedPose& pose : report.added)
        mm += pose.mm / static_cast<double>(report.added.size());
    std::cout << report.added.size() << " poses added behind " << report.known << ", now "
              << frames(report.firstFrame, report.lastFrame) << ": the models are " << numberText(mm)
              << " mm apart in them in the mean, and " << numberText(report.candidatesMm) << " mm in the "
              << report.candidates << " candidates\n";
}

void writeReport(JsonWriter& writer, const KeysReport& report, const Options&) {
    writeCount(writer, "plugs", report.plugs);
    writeCount(writer, "keys", report.keys);
    writeCount(writer, "held", report.held);
    writeFrames(writer, report.firstFrame, report.lastFrame);
}

void printText(const KeysReport& report) {
    std::cout << report.keys << " keys on " << report.plugs << " plugs in "
              << frames(report.firstFrame, report.lastFrame) << "; " << report.held
              << " other controls held at their defaults\n";
}

// of a scene that was only looked at
struct NoReport {};
void writeReport(JsonWriter&, const NoReport&, const Options&) {}
void printText(const NoReport&) {}

std::string counted(std::size_t count, const char* one, const char* many) {
    return std::to_string(count) + ' ' + (count == 1 ? one : many);
}

void printText(const PosesFileReport& file) {
    std::cout << file.file.string() << ": " << counted(file.frames, "frame", "frames") << " of "
              << counted(file.joints, "joint", "joints") << ", " << counted(file.plugs, "plug", "plugs");
    if (file.meshes > 0)
        std::cout << ", " << counted(file.meshes, "mesh", "meshes");
    std::cout << "; frame " << file.sceneFirst << " of the scene is at " << file.place << '\n';
}

template <class Report>
void print(const Report& report, const std::optional<PosesFileReport>& file, const Options& options) {
    if (!options.console.json) {
        printText(report);
        if (file)
            printText(*file);
        return;
    }
    rapidjson::StringBuffer buffer;
    JsonWriter writer(buffer);
    writer.StartObject();
    writeText(writer, "scene", (options.output.empty() ? options.scene.scene : options.output).string());
    writeReport(writer, report, options);
    writeFile(writer, file);
    writer.EndObject();
    std::cout << buffer.GetString() << '\n';
}

// the scene with its new poses, and the file of them, where one is asked for
template <class Report>
void deliver(SceneSession& session, const std::optional<Warp>& warp, const Report& report, const Options& options) {
    std::optional<PosesFileReport> file;
    if (!options.written.file.empty())
        requirePlace(options.written, report.firstFrame);
    session.save(options.output);
    if (!options.written.file.empty())
        file = writePoses(options.written, warp, {report.firstFrame, report.lastFrame, 1}, options.console);
    print(report, file, options);
}

std::optional<Warp> warpOf(const Options& options) {
    const bool hasWarp = !options.deformer.empty() || !nodesOfType("neuralWarp").empty();
    return hasWarp ? std::optional(Warp::find(options.deformer)) : std::nullopt;
}

void requireTolerance(double tolerance) {
    if (!std::isfinite(tolerance) || tolerance < 0.0)
        throw UsageError("--tolerance is a finite number from 0 on");
}

void sample(SceneSession& session, Options& options) {
    options.sampling.fromLimits = options.from != "animation";
    options.sampling.fromAnimation = options.from != "limits";
    if (!options.sampling.fromAnimation && !options.sampling.frames.empty())
        throw UsageError("--frames chooses frames of the animation: add --from animation or --from both");
    if (!options.sampling.fromLimits &&
        (options.sampling.samples || options.sampling.activationRate || options.sampling.limitRate > 0.0))
        throw UsageError("--samples, --activation-rate and --limit-rate are for poses from limits: use --from both");
    requireTolerance(options.sampling.tolerance);
    const Warp warp = Warp::find(options.deformer);
    const SampleReport report = samplePoses(warp, options.sampling, options.console);
    deliver(session, warp, report, options);
}

void refine(SceneSession& session, Options& options) {
    RefineOptions& refining = options.refining;
    if (options.sampling.samples || options.sampling.start || options.from != "limits" ||
        options.sampling.limitRate > 0.0)
        throw UsageError("--samples, --start, --from and --limit-rate are for the first poses: --add N says how many "
                         "--refine adds behind them");
    if (refining.count == 0)
        throw UsageError("--refine needs --add N: how many poses to add");
    requireTolerance(options.sampling.tolerance);
    refining.activationRate = options.sampling.activationRate;
    refining.seed = options.sampling.seed;
    refining.tolerance = options.sampling.tolerance;
    const Warp warp = Warp::find(options.deformer);
    const RefineReport report = refinePoses(warp, refining, options.console);
    deliver(session, warp, report, options);
}

void key(SceneSession& session, const Options& options) {
    const std::optional<Warp> warp = warpOf(options);
    const Stage stage([&] { return "putting the keys of " + options.keys.string() + " on the rig"; });
    const KeysReport report = keyPoses(warp, readKeys(options.keys), options.others == "rest");
    deliver(session, warp, report, options);
}

// the poses that the scene has
void writeOnly(const Options& options) {
    const std::optional<Warp> warp = warpOf(options);
    const FrameRange frames =
        options.sampling.frames.empty() ? framesOfScene(warp) : frameRange(options.sampling.frames);
    print(NoReport(), writePoses(options.written, warp, frames, options.console), options);
}

void pose(Options& options) {
    watchForInterrupt();
    options.output = absolutePath(options.output);
    options.keys = absolutePath(options.keys);
    for (std::filesystem::path& model : options.refining.models)
        model = absolutePath(model);
    options.written.file = absolutePath(options.written.file);
    if (options.output.empty() && options.written.file.empty())
        throw UsageError("--output is required: the scene to write; or --write FILE for the poses that there are");
    if (!options.written.file.empty())
        requirePosesFile(options.written, {absolutePath(options.scene.scene), options.output});
    SceneSession session(options.scene);
    if (options.output.empty())
        writeOnly(options);
    else if (!options.refining.models.empty())
        refine(session, options);
    else if (options.keys.empty())
        sample(session, options);
    else
        key(session, options);
}

void addSamplingOptions(CLI::App& command, Options& options, CLI::Option& output, CLI::Option& keys) {
    SampleOptions& sampling = options.sampling;
    const std::initializer_list<CLI::Option*> added = {
        command.add_option("--samples", sampling.samples, "Poses to draw; the collector's samples when not given"),
        command.add_option("--activation-rate", sampling.activationRate,
                           "How likely a value leaves its default, 0 to 1; the collector's when not given"),
        command
            .add_option("--limit-rate", sampling.limitRate,
                        "How likely an active value stands at one of its limits, 0 to 1")
            ->capture_default_str(),
        command.add_option("--start", sampling.start,
                           "Frame of the first pose; the collector's samplesStartFrame when not given"),
        command.add_option("--seed", sampling.seed, "Another seed gives other poses")->capture_default_str(),
        command.add_option("--from", options.from, "Where poses come from: limits, animation or both")
            ->check(CLI::IsMember({"limits", "animation", "both"}))
            ->capture_default_str(),
        command
            .add_option("--tolerance", sampling.tolerance,
                        "Poses that differ by less, in parts of the range of each value, count as one")
            ->capture_default_str()};
    for (CLI::Option* option : added)
        option->excludes(&keys)->needs(&output);
    command.add_option("--frames", sampling.frames, "Frames of the animation, as 1-100 or 1-100x5; all by default")
        ->excludes(&keys);
}

void addRefineOptions(CLI::App& command, Options& options, CLI::Option& output, CLI::Option& keys) {
    CLI::Option* models = command
                              .add_option("--refine", options.refining.models,
                                          "Add poses to those that the scene has: where these models, trained of them "
                                          "with different seeds, disagree most")
                              ->type_name("MODEL...")
                              ->excludes(&keys)
                              ->needs(&output);
    command.add_option("--add", options.refining.count, "With --refine: how many poses to add")
        ->check(CLI::Range(1, 1'000'000))
        ->needs(models);
    command
        .add_option("--candidates", options.refining.candidates,
                    "With --refine: drawn poses to choose from; 20 for each to add, and 1000 at least, by default")
        ->check(CLI::Range(1, 1'000'000))
        ->needs(models);
}

void addWriteOptions(CLI::App& command, Options& options) {
    CLI::Option* write =
        command
            .add_option(
                "--write", options.written.file,
                "Write the poses, too: .glb (skeleton, meshes, keys), .json (as --keys reads it), .csv or .bvh; "
                "without -o those that the scene has")
            ->type_name("FILE");
    command
        .add_option("--frame-offset", options.written.frameOffset,
                    "Added to the frames in the file. Frame 1 is at second 0 where a file counts seconds; -1 is for "
                    "tools whose first frame is 0")
        ->check(CLI::Range(-100'000'000, 100'000'000))
        ->needs(write)
        ->capture_default_str();
}

} // namespace

void addPoseCommand(CLI::App& app) {
    const auto options = std::make_shared<Options>();
    CLI::App* command = app.add_subcommand("pose", "Sample poses of a rig, or put poses made by hand on it");
    addSceneOptions(*command, options->scene);
    CLI::Option* output = command->add_option("-o,--output", options->output, "The scene to write");
    command->add_option("--deformer", options->deformer, "The neuralWarp node, where there are several");
    CLI::Option* keys =
        command->add_option("--keys", options->keys, "Poses made by hand: a JSON file with keys")->needs(output);
    command->add_option("--others", options->others, "With --keys, controls without keys: rest or keep")
        ->check(CLI::IsMember({"rest", "keep"}))
        ->needs(keys)
        ->capture_default_str();
    addSamplingOptions(*command, *options, *output, *keys);
    addRefineOptions(*command, *options, *output, *keys);
    addWriteOptions(*command, *options);
    addConsoleOptions(*command, options->console, true);
    addProgressOption(*command, options->console);
    command->callback([options] { pose(*options); });
}

} // namespace quarn
