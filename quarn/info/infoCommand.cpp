// SPDX-License-Identifier: Apache-2.0
#include "quarn/info/commands.h"

#include "openquarn_app/Gpu.h"
#include "openquarn_app/Messages.h"
#include "openquarn_app/SceneFile.h"
#include "quarn/console/Log.h"
#include "quarn/console/StdoutAside.h"
#include "quarn/console/UsageError.h"
#include "quarn/console/build.h"
#include "quarn/console/interrupt.h"
#include "quarn/console/json.h"
#include "quarn/console/printable.h"
#include "quarn/info/JointReport.h"
#include "quarn/info/LineList.h"
#include "quarn/info/ModelReport.h"
#include "quarn/info/SceneFilesReport.h"
#include "quarn/info/SceneReport.h"
#include "quarn/info/SliderReport.h"
#include "quarn/scene/SceneSession.h"
#include "quarn/scene/Warp.h"
#include "quarn/scene/frames.h"
#include "quarn/scene/meshSum.h"
#include "quarn/scene/meshes.h"
#include "quarn/scene/plugs.h"

#include <CLI/CLI.hpp>

#include <filesystem>
#include <iostream>
#include <optional>
#include <sstream>
#include <stdexcept>

namespace quarn {
namespace {

namespace fs = std::filesystem;
using OpenQuarn::SceneSummary;

// a scene as far as it could be opened
struct OpenedScene {
    std::optional<SceneReport> report;
    std::vector<std::string> missingTypes;
    std::vector<std::string> warnings; ///< of the file: what the host did not understand in it
    std::string whyNot;                ///< without a report
};

// what the host has to say while it opens a scene is in what is printed already
class Silence {
public:
    Silence()
        : before_(OpenQuarn::setMessageSink([](const OpenQuarn::Message& message) {
            log([&] { return std::string(OpenQuarn::severityName(message.severity)) + ": " + message.text; });
        })) {}
    ~Silence() { OpenQuarn::setMessageSink(std::move(before_)); }
    Silence(const Silence&) = delete;
    Silence& operator=(const Silence&) = delete;

private:
    OpenQuarn::MessageSink before_;
};

OpenedScene openedScene(const fs::path& path) {
    OpenedScene opened;
    const Silence silence;
    const StdoutAside aside;
    try {
        SceneSession session;
        opened.missingTypes = OpenQuarn::readSummary(absolutePath(path)).missingTypes;
        opened.warnings = session.open(path);
        opened.report = describeScene();
    } catch (const std::runtime_error& error) {
        opened.whyNot = error.what();
    }
    return opened;
}

void printJson(const SceneSummary& summary, const OpenedScene& opened) {
    rapidjson::StringBuffer buffer;
    JsonWriter writer(buffer);
    writer.StartObject();
    writer.Key("version");
    writer.Int(summary.version);
    writeText(writer, "writtenBy", summary.writtenBy);
    writer.Key("bytes");
    writer.Uint64(summary.bytes);
    writer.Key("time");
    writer.Double(summary.time);
    writer.Key("nodes");
    writer.Uint64(summary.nodes);
    writer.Key("connections");
    writer.Uint64(summary.connections);
    writer.Key("nodesByType");
    writer.StartObject();
    for (const auto& [type, count] : summary.nodesByType) {
        writeText(writer, type);
        writer.Uint64(count);
    }
    writer.EndObject();
    writeTexts(writer, "plugins", summary.plugins);
    writeTexts(writer, "missingTypes", opened.missingTypes);
    writeTexts(writer, "warnings", opened.warnings);
    writeBool(writer, "described", opened.report.has_value());
    if (opened.report)
        writeScene(writer, *opened.report);
    else
        writeText(writer, "notDescribed", opened.whyNot);
    writer.EndObject();
    std::cout << printable(buffer.GetString()) << '\n';
}

std::string summaryText(const SceneSummary& summary, const OpenedScene& opened) {
    std::ostringstream text;
    text << "format version " << summary.version << ", written by " << summary.writtenBy << ", " << summary.bytes
         << " bytes\ntime " << summary.time << '\n'
         << summary.nodes << " nodes, " << summary.connections << " connections\n";
    LineList types("types of nodes");
    for (const auto& [type, count] : summary.nodesByType)
        types.add("  " + std::to_string(count) + " " + (type.empty() ? "without a type" : type));
    LineList plugins("plug-ins");
    for (const std::string& plugin : summary.plugins)
        plugins.add("needs plug-in " + plugin);
    LineList missing("unknown types");
    for (const std::string& type : opened.missingTypes)
        missing.add("node type " + (type.empty() ? "without a name" : type) + " is in no loaded plug-in");
    LineList warnings("warnings");
    for (const std::string& warning : opened.warnings)
        warnings.add("warning: " + warning);
    text << types.text() << plugins.text() << missing.text() << warnings.text();
    if (opened.report)
        text << sceneText(*opened.report);
    else
        text << "no more can be told: " << opened.whyNot << '\n';
    return text.str();
}

struct Options {
    fs::path path, scene, controls, outputs;
    std::string deformer, geometry, frames;
    bool json = false, build = false, devices = false, joints = false, files = false;
};

void showBuild(bool asJson) {
    if (!asJson) {
        std::cout << "quarn " QUARN_VERSION ", built from " << buildId() << "\ninstruction set " << instructionSet()
                  << '\n';
        return;
    }
    rapidjson::StringBuffer buffer;
    JsonWriter writer(buffer);
    writer.StartObject();
    writeText(writer, "version", QUARN_VERSION);
    writeText(writer, "build", buildId());
    writeText(writer, "instructionSet", instructionSet());
    writer.EndObject();
    std::cout << buffer.GetString() << '\n';
}

void showDevices(bool asJson) {
    const std::vector<OpenQuarn::GpuDevice> devices = OpenQuarn::Gpu::devices();
    log([&] { return std::to_string(devices.size()) + " OpenCL devices"; });
    rapidjson::StringBuffer buffer;
    JsonWriter writer(buffer);
    writer.StartArray();
    for (const OpenQuarn::GpuDevice& device : devices) {
        writer.StartObject();
        writeText(writer, "name", device.name);
        writeText(writer, "platform", device.platform);
        writeText(writer, "driver", device.driver);
        writeBool(writer, "gpu", device.isGpu);
        writeBool(writer, "doubles", device.hasDoubles);
        writer.Key("memory");
        writer.Uint64(device.memory);
        writer.EndObject();
    }
    writer.EndArray();
    if (asJson) {
        std::cout << buffer.GetString() << '\n';
        return;
    }
    for (std::size_t i = 0; i < devices.size(); ++i)
        std::cout << i << ": " << devices[i].name << (devices[i].isGpu ? ", a GPU" : "") << " of "
                  << devices[i].platform << ", driver " << devices[i].driver << ", " << (devices[i].memory >> 20U)
                  << " MiB" << (devices[i].hasDoubles ? "" : ", without doubles") << '\n';
    if (devices.empty())
        std::cout << "no OpenCL device: deformers run on the CPU\n";
}

void showJoints(const Options& options) {
    std::vector<JointReport> joints;
    std::vector<SliderReport> sliders;
    {
        const Silence silence;
        const StdoutAside aside;
        SceneSession session;
        session.open(options.path);
        joints = describeJoints();
        sliders = describeSliders();
    }
    if (!options.json) {
        std::cout << printable(jointsText(joints) + slidersText(sliders));
        return;
    }
    rapidjson::StringBuffer buffer;
    JsonWriter writer(buffer);
    writer.StartObject();
    writeJoints(writer, joints);
    writeSliders(writer, sliders);
    writer.EndObject();
    std::cout << printable(buffer.GetString()) << '\n';
}

void showFiles(const Options& options) {
    SceneFilesReport report;
    {
        const Silence silence;
        const StdoutAside aside;
        SceneSession session;
        session.open(options.path);
        report = describeFiles(absolutePath(options.path), options.deformer);
    }
    std::cout << printable(options.json ? filesJson(report) : filesText(report));
}

void showScene(const Options& options) {
    requireNoCharacter(options.path);
    if (options.joints)
        return showJoints(options);
    if (options.files)
        return showFiles(options);
    const Stage stage([&] { return "looking into scene " + options.path.string(); });
    const SceneSummary summary = OpenQuarn::readSummary(absolutePath(options.path));
    if (!summary.outcome)
        throw std::runtime_error(summary.outcome.error);
    const OpenedScene opened = openedScene(options.path);
    if (options.json)
        printJson(summary, opened);
    else
        std::cout << printable(summaryText(summary, opened));
}

// those that are asked for, or of the export range so many that nobody waits for them
FrameRange framesToLookAt(const Options& options, const Warp& warp) {
    if (!options.frames.empty())
        return frameRange(options.frames);
    constexpr std::size_t most = 10'000;
    FrameRange frames = frameRange(std::to_string(wholeNumberOf(warp.plug("exportStartFrame"))) + "-" +
                                   std::to_string(wholeNumberOf(warp.plug("exportEndFrame"))));
    frames.step = static_cast<int>((frames.count() + most - 1) / most);
    return frames;
}

// whether the model, which has a certificate, knows the poses of the scene: nothing but the controls is evaluated
PoseReport posesOfScene(SceneSession& session, const Options& options, const Warp& warp, const WarpGeometry& geometry,
                        const ModelReport& model) {
    PoseReport report{warp.name, geometry.name, model.directory.stem().string(), model.knowledge.why, true, {}};
    PoseCounter counter(*model.knowledge.certificate, model.knowledge.poses);
    const FrameRange frames = framesToLookAt(options, warp);
    for (std::size_t number = 0; number < frames.count(); ++number) {
        throwIfInterrupted();
        session.host().setTime(frames.frame(number));
        counter.add(frames.frame(number), controlsOf(warp));
    }
    report.counts = counter.counts();
    return report;
}

Fit fitOfScene(const Options& options, const ModelReport& model) {
    SceneSession session;
    session.open(options.scene);
    const Warp warp = Warp::find(options.deformer);
    const WarpGeometry& geometry = warp.geometry(options.geometry);
    GeometryFacts facts = factsOf(warp, geometry);
    if (vertexCountOf(geometry.original) != 0)
        facts.restSum = meshSum(geometry.original);
    Fit fit = fitOf(model, facts);
    if (model.knowledge.certificate)
        fit.poses.push_back(posesOfScene(session, options, warp, geometry, model));
    return fit;
}

void showModel(const Options& options) {
    // in this order: the process apart is a copy of this one while it has one thread
    const storage::FloatTable controls =
        options.controls.empty() ? storage::FloatTable() : storage::readFloatTable(absolutePath(options.controls));
    if (!options.controls.empty() && controls.columns == 0)
        throw std::runtime_error(options.controls.string() + " has no numbers in its rows");
    const ModelAnswer answer = readModelApart(absolutePath(options.path), controls);
    const ModelReport& model = answer.model;
    std::cerr << printable(answer.printed);
    std::optional<Fit> fit;
    if (!options.scene.empty()) {
        const StdoutAside aside;
        fit = fitOfScene(options, model);
    }
    if (!options.controls.empty())
        storage::writeFloatTable(absolutePath(options.outputs), {controls.rows, model.outputs, answer.outputs});
    std::cout << printable(options.json ? modelJson(model, fit) : modelText(model, fit));
    std::cout.flush();
    if (!model.problems.empty())
        throw std::runtime_error(options.path.string() + " is damaged: " + model.problems.front());
    if (fit && !fit->errors.empty())
        throw std::runtime_error(options.path.string() + " does not fit: " + fit->errors.front());
}

void showInfo(const Options& options) {
    watchForInterrupt();
    if (options.build)
        return showBuild(options.json);
    if (options.devices)
        return showDevices(options.json);
    if (options.path.empty())
        throw UsageError("quarn info needs the path of a scene file or a model directory, --devices or --build");
    if (fs::is_directory(options.path) && (options.joints || options.files))
        throw UsageError(options.path.string() + " is a model directory, and " +
                         (options.joints ? "--joints" : "--files") + " is for a scene");
    if (!options.frames.empty() && options.scene.empty())
        throw UsageError("--frames goes with --scene: the frames of it that the model is to know");
    if (fs::is_directory(options.path))
        return showModel(options);
    if (!options.scene.empty() || !options.controls.empty())
        throw UsageError(options.path.string() + " is no model directory, and --scene and --run are for one");
    showScene(options);
}

} // namespace

void addInfoCommand(CLI::App& app) {
    const auto options = std::make_shared<Options>();
    CLI::App* info = app.add_subcommand("info", "Show what is in a scene file or a model directory");
    info->add_option("PATH", options->path, "The scene file, or the directory NAME.nwrp of a model");
    info->add_flag(
        "--build", options->build,
        "The version of quarn, the commit that it was built from, and the instruction set that it uses here");
    info->add_flag("--devices", options->devices, "List the OpenCL devices that quarn play --evaluator gpu can use");
    info->add_flag("--joints", options->joints,
                   "Of a scene: each joint, its parent, what is posed and how far, and "
                   "how many vertices it moves; and the sliders that are posed");
    info->add_flag(
        "--files", options->files,
        "Of a scene: each file that it reads for its frames, those that are not there, and the frames of its "
        "export range");
    info->add_option("--scene", options->scene, "Tell whether the model fits the deformer of this scene");
    info->add_option("--deformer", options->deformer, "The neuralWarp node, where there are several");
    info->add_option("--geometry", options->geometry, "Index or name of the mesh, where it deforms several");
    info->add_option(
            "--frames", options->frames,
            "With --scene: the frames whose poses the model is to know; the deformer's export range by default")
        ->type_name("A-B[xS]");
    CLI::Option* run = info->add_option("--run", options->controls, "Run the network on each row of this array")
                           ->type_name("CONTROLS.npy");
    CLI::Option* outputs =
        info->add_option("--outputs", options->outputs, "Where --run writes what it gives")->type_name("OUT.npy");
    run->needs(outputs);
    outputs->needs(run);
    info->add_flag("--json", options->json, "Print JSON");
    info->callback([options] { showInfo(*options); });
}

} // namespace quarn
