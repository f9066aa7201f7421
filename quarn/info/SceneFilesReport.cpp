// SPDX-License-Identifier: Apache-2.0
#include "quarn/info/SceneFilesReport.h"

#include "quarn/console/json.h"
#include "quarn/info/LineList.h"
#include "quarn/scene/Warp.h"
#include "quarn/scene/plugs.h"
#include "quarn/scene/sceneFiles.h"
#include "quarn/scene/units.h"

#include <algorithm>
#include <system_error>

namespace quarn {
namespace {

namespace fs = std::filesystem;

void addOnce(std::vector<fs::path>& paths, const fs::path& path) {
    if (std::find(paths.begin(), paths.end(), path) == paths.end())
        paths.push_back(path);
}

void addFile(SceneFilesReport& report, const SceneFile& file) {
    std::error_code error;
    const bool isThere = fs::exists(file.path, error);
    // no frame is made of the file that a character came from
    if (!isThere && nodeType(findNode(file.node)) == "character")
        return;
    addOnce(report.files, file.path);
    if (!isThere)
        addOnce(report.missing, file.path);
}

void describeWarp(SceneFilesReport& report, const Warp& warp) {
    report.deformer = warp.name;
    for (const WarpGeometry& geometry : warp.geometries)
        report.geometries.push_back(geometry.name);
    const int first = wholeNumberOf(warp.plug("exportStartFrame"));
    const int last = wholeNumberOf(warp.plug("exportEndFrame"));
    if (first <= last)
        report.frames = std::to_string(first) + "-" + std::to_string(last);
}

} // namespace

SceneFilesReport describeFiles(const fs::path& scene, const std::string& deformer) {
    SceneFilesReport report;
    report.files.push_back(scene);
    for (const SceneFile& file : sceneFiles())
        addFile(report, file);
    const std::vector<HObject> warps = nodesOfType("neuralWarp");
    for (const HObject& node : warps) {
        const Warp warp = Warp::find(nodeName(node));
        for (const WarpGeometry& geometry : warp.geometries)
            for (const SceneFile& file : filesOfModel(warp, geometry))
                addFile(report, file);
    }
    report.framesPerSecond = framesPerSecond();
    if (!deformer.empty() || warps.size() == 1)
        describeWarp(report, Warp::find(deformer));
    return report;
}

std::string filesText(const SceneFilesReport& report) {
    LineList files("files");
    for (const fs::path& file : report.files) {
        const bool isMissing = std::find(report.missing.begin(), report.missing.end(), file) != report.missing.end();
        files.add(file.string() + (isMissing ? ", not there" : ""));
    }
    if (report.deformer.empty())
        return files.text();
    std::string line = "deformer " + report.deformer + ", frames " + (report.frames.empty() ? "none" : report.frames);
    for (const std::string& geometry : report.geometries)
        line += ", " + geometry;
    return files.text() + line + "\n";
}

std::string filesJson(const SceneFilesReport& report) {
    rapidjson::StringBuffer buffer;
    JsonWriter json(buffer);
    json.StartObject();
    writeTexts(json, "files", report.files);
    writeTexts(json, "missing", report.missing);
    writeTextOrNull(json, "frames", report.frames);
    json.Key("framesPerSecond");
    if (report.framesPerSecond)
        json.Double(*report.framesPerSecond);
    else
        json.Null();
    writeTextOrNull(json, "deformer", report.deformer);
    writeTexts(json, "geometries", report.geometries);
    json.EndObject();
    return buffer.GetString() + std::string("\n");
}

} // namespace quarn
