// SPDX-License-Identifier: Apache-2.0
#include "quarn/console/Log.h"
#include "quarn/console/UsageError.h"
#include "quarn/console/consoleOptions.h"
#include "quarn/console/interrupt.h"
#include "quarn/console/json.h"
#include "quarn/dataset/commands.h"
#include "quarn/dataset/merging.h"

#include <CLI/CLI.hpp>

#include <algorithm>
#include <iostream>

namespace quarn {
namespace {

// by its name, as what is not there yet has no more
bool isCache(const std::filesystem::path& path) {
    return path.extension() == ".npy" && !std::filesystem::is_directory(path);
}

bool areCaches(const MergeOptions& options) {
    const auto other = std::find_if(options.parts.begin(), options.parts.end(),
                                    [&](const auto& part) { return isCache(part) != isCache(options.parts.front()); });
    if (other != options.parts.end())
        throw UsageError("of " + options.parts.front().string() + " and " + other->string() +
                         " only one is a point cache: parts are data sets, or all of them .npy files");
    return isCache(options.parts.front());
}

std::string textOf(const std::set<std::string>& words) {
    std::string text;
    for (const std::string& word : words)
        text += (text.empty() ? "" : ", ") + word;
    return text;
}

void print(const MergeAnswer& answer, std::size_t parts, bool areCaches, bool asJson) {
    if (!asJson) {
        std::cout << answer.rows << (areCaches ? " frames" : " rows") << " of " << parts << " parts, " << answer.bytes
                  << " bytes, in " << answer.output.string() << '\n';
        return;
    }
    rapidjson::StringBuffer buffer;
    JsonWriter writer(buffer);
    writer.StartObject();
    writeText(writer, "kind", areCaches ? "cache" : "dataset");
    writeText(writer, "output", answer.output.string());
    writeCount(writer, "parts", parts);
    writeCount(writer, "rows", answer.rows);
    writeCount(writer, "bytes", answer.bytes);
    writeBool(writer, "wasComplete", answer.wasComplete);
    writer.Key("instructionSets");
    writer.StartArray();
    for (const std::string& set : answer.instructionSets)
        writeText(writer, set);
    writer.EndArray();
    writer.EndObject();
    std::cout << buffer.GetString() << '\n';
}

void execute(const MergeOptions& options) {
    watchForInterrupt();
    const bool caches = areCaches(options);
    const MergeAnswer answer = caches ? mergeCaches(options) : mergeDatasets(options);
    if (!answer.instructionSets.empty())
        log([&] { return "the parts were made with " + textOf(answer.instructionSets); });
    print(answer, options.parts.size(), caches, options.console.json);
}

} // namespace

void addMergeCommand(CLI::App& app) {
    const auto options = std::make_shared<MergeOptions>();
    CLI::App* command =
        app.add_subcommand("merge", "Join parts of a data set, or of a point cache, that were made with --of");
    command->add_option("PART", options->parts, "Folders of data sets, or .npy files; in any order")->required();
    command->add_option("-o,--output", options->output, "The folder or the .npy file to make")
        ->type_name("SET")
        ->required();
    command->add_flag("--overwrite", options->overwrite, "Replace another one that is there, or give up a begun one");
    addConsoleOptions(*command, options->console, true);
    addProgressOption(*command, options->console);
    command->callback([options] { execute(*options); });
}

} // namespace quarn
