// SPDX-License-Identifier: Apache-2.0
#include "quarn/dataset/exportControls.h"

#include "quarn/console/Log.h"
#include "quarn/console/UsageError.h"
#include "quarn/console/json.h"
#include "quarn/dataset/DatasetFolder.h"
#include "quarn/dataset/DatasetWriter.h"
#include "quarn/dataset/exportFrames.h"
#include "quarn/dataset/strictly.h"
#include "quarn/scene/ControlReader.h"
#include "quarn/scene/FrameLog.h"
#include "quarn/scene/plugs.h"
#include "storage/WholeFile.h"
#include "storage/npyArray.h"

#include <algorithm>
#include <stdexcept>

namespace quarn {
namespace {

namespace fs = std::filesystem;

constexpr const char* controlsDescription = "controls.json";

fs::path folderOf(const Warp& warp, const ExportOptions& options) {
    if (!options.output.empty())
        return absolutePath(options.output).lexically_normal();
    const fs::path root = textOf(warp.plug("trainingDataRoot"));
    if (root.empty())
        throw std::runtime_error(warp.name + ".trainingDataRoot is empty; set it, or say with -o where to export to");
    // a scene may come from anywhere, and is not to choose a place above its own that looks like one below
    if (std::find(root.begin(), root.end(), "..") != root.end())
        throw std::runtime_error("the scene would have controls exported to " + root.string() + " (" + warp.name +
                                 ".trainingDataRoot); say with -o where to export to");
    return (fs::current_path() / root / (warp.name + ".controls")).lexically_normal();
}

void requireFree(const fs::path& folder, bool overwrite) {
    std::error_code none;
    if (fs::exists(folder / descriptionFile, none))
        throw std::runtime_error(folder.string() + " holds a data set, whose controls.npy belongs to its deltas; name "
                                                   "another folder with -o");
    if (fs::exists(folder / controlsDescription, none) && !overwrite)
        throw std::runtime_error(folder.string() + " holds controls already; --overwrite replaces them");
    storage::WholeFile::requirePossible(folder / controlsDescription);
}

void requireRoom(const FrameRange& frames, std::size_t controls) {
    constexpr std::size_t most = 500'000'000; // numbers: 2 GB, all of them in memory
    if (frames.count() > most / controls)
        throw std::runtime_error(std::to_string(frames.count()) + " frames of " + std::to_string(controls) +
                                 " controls are more than the " + std::to_string(most) +
                                 " numbers that are written at once; choose a part with --frames");
}

std::string descriptionOf(const ExportOptions& options, const Warp& warp, const storage::FloatTable& table,
                          const std::vector<std::string>& names) {
    rapidjson::StringBuffer buffer;
    JsonWriter json(buffer);
    json.StartObject();
    writeText(json, "format", "neuralWarp controls");
    writeCount(json, "version", 1);
    writeText(json, "writtenBy", "quarn " QUARN_VERSION);
    writeText(json, "scene", options.scene.scene.filename().string());
    writeText(json, "deformer", warp.name);
    writeCount(json, "frameCount", table.rows);
    writeCount(json, "controlCount", table.columns);
    json.Key("controlNames");
    json.StartArray();
    for (const std::string& name : names)
        writeText(json, name);
    json.EndArray();
    json.EndObject();
    return std::string(buffer.GetString()) + "\n";
}

storage::FloatTable readTable(SceneSession& session, ControlReader& reader, const FrameRange& frames,
                              const Console& console) {
    storage::FloatTable table;
    Progress progress(console, "exporting controls", frames.count());
    for (std::size_t number = 0; number < frames.count(); ++number) {
        const int frame = frames.frame(number);
        const FrameLog log(frame);
        session.host().setTime(frame);
        strictly(frame, [&] {
            reader.read();
            if (number == 0)
                reader.readNames();
        });
        requireRoom(frames, reader.names().size());
        table.values.insert(table.values.end(), reader.values().begin(), reader.values().end());
        progress.advance();
    }
    table.rows = frames.count();
    table.columns = reader.names().size();
    return table;
}

} // namespace

ControlsAnswer exportControls(const ExportOptions& options) {
    if (!options.geometry.empty())
        throw UsageError("--controls-only is of the whole deformer: --geometry has no part in it");
    SceneSession session(options.scene);
    const Warp warp = Warp::find(options.deformer);
    const FrameRange frames = exportFrames(warp, options.frames);
    const fs::path folder = folderOf(warp, options);
    requireFree(folder, options.overwrite);
    Stage stage([&] { return "exporting controls to " + folder.string(); });
    ControlReader reader(warp);
    const storage::FloatTable table = readTable(session, reader, frames, options.console);
    std::vector<std::int32_t> numbers;
    for (std::size_t number = 0; number < frames.count(); ++number)
        numbers.push_back(frames.frame(number));
    storage::writeFloatTable(folder / datasetFile::controls, table);
    storage::writeIntegers(folder / datasetFile::frames, numbers);
    storage::writeWhole(folder / controlsDescription, descriptionOf(options, warp, table, reader.names()));
    stage.result([&] { return std::to_string(table.rows) + " rows"; });
    return {folder, table.rows, table.columns};
}

} // namespace quarn
