// SPDX-License-Identifier: Apache-2.0
#include "quarn/commands.h"

#include "openquarn_app/Gpu.h"
#include "openquarn_app/Messages.h"
#include "openquarn_app/SceneFile.h"
#include "quarn/console/StdoutAside.h"
#include "quarn/console/UsageError.h"
#include "quarn/console/interrupt.h"
#include "quarn/console/json.h"
#include "quarn/files/npyArray.h"
#include "quarn/info/ModelReport.h"
#include "quarn/info/SceneReport.h"
#include "quarn/scene/SceneSession.h"
#include "quarn/scene/Warp.h"

#include <CLI/CLI.hpp>

#include <filesystem>
#include <iostream>
#include <optional>
#include <span>
#include <stdexcept>

namespace quarn {
namespace {

namespace fs = std::filesystem;
using OpenQuarn::SceneSummary;

void writeTexts(JsonWriter& writer, const char* key, const std::vector<std::string>& texts) {
    writer.Key(key);
    writer.StartArray();
    for (const std::string& text : texts)
        writeText(writer, text);
    writer.EndArray();
}

// a scene as far as it could be opened
struct OpenedScene {
    std::optional<SceneReport> report;
    std::vector<std::string> missingTypes;
    std::string whyNot; ///< without a report
};

// what the host has to say while it opens a scene is in the report already
class Silence {
public:
    Silence()
        : before_(OpenQuarn::setMessageSink([](const OpenQuarn::Message&) {})) {}
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
        session.open(path);
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
    writeBool(writer, "described", opened.report.has_value());
    if (opened.report)
        writeScene(writer, *opened.report);
    else
        writeText(writer, "notDescribed", opened.whyNot);
    writer.EndObject();
    std::cout << buffer.GetString() << '\n';
}

void printText(const SceneSummary& summary, const OpenedScene& opened) {
    std::cout << "format version " << summary.version << ", written by " << summary.writtenBy << ", " << summary.bytes
              << " bytes\ntime " << summary.time << '\n'
              << summary.nodes << " nodes, " << summary.connections << " connections\n";
    for (const auto& [type, count] : summary.nodesByType)
        std::cout << "  " << count << ' ' << (type.empty() ? "without a type" : type) << '\n';
    for (const std::string& plugin : summary.plugins)
        std::cout << "needs plug-in " << plugin << '\n';
    for (const std::string& type : opened.missingTypes)
        std::cout << "node type " << (type.empty() ? "without a name" : type) << " is in no loaded plug-in\n";
    if (opened.report)
        std::cout << sceneText(*opened.report);
    else
        std::cout << "no more can be told: " << opened.whyNot << '\n';
}

struct Options {
    fs::path path, scene, controls, outputs;
    std::string deformer, geometry;
    bool json = false, devices = false;
};

void showDevices(bool asJson) {
    const std::vector<OpenQuarn::GpuDevice> devices = OpenQuarn::Gpu::devices();
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

void showScene(const Options& options) {
    requireNoCharacter(options.path);
    const SceneSummary summary = OpenQuarn::readSummary(absolutePath(options.path));
    if (!summary.outcome)
        throw std::runtime_error(summary.outcome.error);
    const OpenedScene opened = openedScene(options.path);
    if (options.json)
        printJson(summary, opened);
    else
        printText(summary, opened);
}

GeometryFacts factsOfScene(const Options& options) {
    SceneSession session;
    session.open(options.scene);
    const Warp warp = Warp::find(options.deformer);
    return factsOf(warp, warp.geometry(options.geometry));
}

// each row through the network as it is, for those who want to know whether it does what they trained
void runNetwork(neuralWarp::ModelSession& session, const ModelReport& model, const Options& options) {
    const FloatTable controls = readFloatTable(absolutePath(options.controls));
    if (model.outputs == 0)
        throw std::runtime_error(model.directory.string() + " has no network that can be run");
    if (controls.columns != model.inputs)
        throw std::runtime_error(options.controls.string() + " has " + std::to_string(controls.columns) +
                                 " numbers in a row, and the network takes " + std::to_string(model.inputs));
    FloatTable outputs{controls.rows, model.outputs, {}};
    for (std::size_t row = 0; row < controls.rows; ++row) {
        throwIfInterrupted();
        const auto given = session.run(std::span(controls.values).subspan(row * controls.columns, controls.columns));
        if (given.size() != model.outputs)
            throw std::runtime_error("row " + std::to_string(row) + ": " + session.errorText());
        outputs.values.insert(outputs.values.end(), given.begin(), given.end());
    }
    writeFloatTable(absolutePath(options.outputs), outputs);
}

void showModel(const Options& options) {
    ModelReport model;
    std::optional<Fit> fit;
    {
        const StdoutAside aside;
        neuralWarp::ModelSession session;
        model = readModel(absolutePath(options.path), session);
        if (!options.scene.empty())
            fit = fitOf(model, factsOfScene(options));
        if (!options.controls.empty())
            runNetwork(session, model, options);
    }
    std::cout << (options.json ? modelJson(model, fit) : modelText(model, fit));
    std::cout.flush();
    if (!model.problems.empty())
        throw std::runtime_error(options.path.string() + " is damaged: " + model.problems.front());
    if (fit && !fit->errors.empty())
        throw std::runtime_error(options.path.string() + " does not fit: " + fit->errors.front());
}

void showInfo(const Options& options) {
    watchForInterrupt();
    if (options.devices)
        return showDevices(options.json);
    if (options.path.empty())
        throw UsageError("quarn info needs the path of a scene file or a model directory, or --devices");
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
    info->add_flag("--devices", options->devices, "List the OpenCL devices that quarn play --evaluator gpu can use");
    info->add_option("--scene", options->scene, "Tell whether the model fits the deformer of this scene");
    info->add_option("--deformer", options->deformer, "The neuralWarp node, where there are several");
    info->add_option("--geometry", options->geometry, "Index or name of the mesh, where it deforms several");
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
