// SPDX-License-Identifier: Apache-2.0
#include "quarn/commands.h"

#include "openquarn_app/SceneFile.h"
#include "quarn/console/json.h"

#include <CLI/CLI.hpp>

#include <iostream>
#include <stdexcept>

namespace quarn {
namespace {

using OpenQuarn::SceneSummary;

void writeTexts(JsonWriter& writer, const char* key, const std::vector<std::string>& texts) {
    writer.Key(key);
    writer.StartArray();
    for (const std::string& text : texts)
        writeText(writer, text);
    writer.EndArray();
}

void printJson(const SceneSummary& summary) {
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
    writer.EndObject();
    std::cout << buffer.GetString() << '\n';
}

void printText(const SceneSummary& summary) {
    std::cout << "format version " << summary.version << ", written by " << summary.writtenBy << ", " << summary.bytes
              << " bytes\ntime " << summary.time << '\n'
              << summary.nodes << " nodes, " << summary.connections << " connections\n";
    for (const auto& [type, count] : summary.nodesByType)
        std::cout << "  " << count << ' ' << (type.empty() ? "without a type" : type) << '\n';
    for (const std::string& plugin : summary.plugins)
        std::cout << "needs plug-in " << plugin << '\n';
}

struct Options {
    std::string scene;
    bool json = false;
};

void showInfo(const Options& options) {
    const SceneSummary summary = OpenQuarn::readSummary(options.scene);
    if (!summary.outcome)
        throw std::runtime_error(summary.outcome.error);
    if (options.json)
        printJson(summary);
    else
        printText(summary);
}

} // namespace

void addInfoCommand(CLI::App& app) {
    const auto options = std::make_shared<Options>();
    CLI::App* info = app.add_subcommand("info", "Show what is in a scene file");
    info->add_option("SCENE", options->scene, "The scene file")->required();
    info->add_flag("--json", options->json, "Print JSON");
    info->callback([options] { showInfo(*options); });
}

} // namespace quarn
