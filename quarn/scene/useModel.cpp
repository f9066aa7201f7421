// SPDX-License-Identifier: Apache-2.0
#include "quarn/scene/useModel.h"

#include "quarn/scene/HostErrors.h"
#include "quarn/scene/meshes.h"
#include "quarn/scene/modelDirectory.h"
#include "quarn/scene/modelFiles.h"
#include "quarn/scene/plugs.h"

#include <CLI/CLI.hpp>

#include <algorithm>
#include <filesystem>
#include <system_error>

namespace quarn {
namespace {

namespace fs = std::filesystem;

bool fits(const fs::path& directory, std::size_t vertices) {
    std::error_code error;
    if (directory.extension() != ".nwrp" || !fs::is_regular_file(directory / "model.onnx", error))
        return false;
    std::vector<std::string> problems;
    neuralWarp::ModelMetadata metadata;
    readMetadata(directory, metadata, problems);
    return problems.empty() && metadata.fullCount == vertices;
}

std::vector<std::string> fittingModels(const fs::path& root, std::size_t vertices) {
    std::vector<std::string> names;
    std::error_code error; // a root that cannot be read has no models
    for (fs::directory_iterator entry(root, error), end; !error && entry != end; entry.increment(error))
        if (fits(entry->path(), vertices))
            names.push_back(entry->path().stem().string());
    std::sort(names.begin(), names.end());
    return names;
}

std::string listed(const std::vector<std::string>& names) {
    constexpr std::size_t most = 5;
    std::string text;
    for (std::size_t i = 0; i < std::min(names.size(), most); ++i)
        text += (i > 0 ? ", " : "") + names[i];
    return names.size() > most ? text + " ..." : text;
}

// only where there is no doubt which one is meant (decision 0136)
ModelInUse takeTheOnlyOne(const Warp& warp, const WarpGeometry& geometry) {
    const std::string root = textOf(warp.plug("modelRoot"));
    const HostErrors unsaid; // the mesh is evaluated once more, and what is wrong is said then
    const std::vector<std::string> names = fittingModels(root, vertexCountOf(geometry.input));
    if (names.size() == 1) {
        useModel(warp, geometry, names.front());
        return {names.front(), "only one that fits",
                "the model of " + warp.name + " is off in the scene; taken is " + names.front() + ", the only one in " +
                    root + " that fits (--no-model shows the mesh as it came in)"};
    }
    const std::string several =
        names.empty() ? "" : ", and several in " + root + " fit (" + listed(names) + "; --model chooses one)";
    return {"", "", "the model of " + warp.name + " is off" + several + ": this is the mesh as it came in"};
}

} // namespace

void addModelOptions(CLI::App& command, ModelOption& option) {
    CLI::Option* name = command.add_option(
        "--model", option.name, "Use the model NAME.nwrp of the deformer's modelRoot for this run, switched on");
    name->type_name("NAME");
    command.add_flag("--no-model", option.hasNone, "Show the mesh as it comes into the deformer")->excludes(name);
}

void useModel(const Warp& warp, const WarpGeometry& geometry, const std::string& name) {
    setText(warp.plug("models", geometry, "modelName"), name);
    requireModelDirectory(warp, geometry);
    setNumber(warp.plug("models", geometry, "modelActive"), 1.0);
}

ModelInUse chooseModel(const Warp& warp, const WarpGeometry& geometry, const ModelOption& option) {
    const HPlug active = warp.plug("models", geometry, "modelActive");
    if (option.hasNone) {
        setNumber(active, 0.0);
        return {};
    }
    if (!option.name.empty()) {
        useModel(warp, geometry, option.name);
        return {option.name, "option", ""};
    }
    if (isModelActive(warp, geometry) || !active.source().isNull())
        return {textOf(warp.plug("models", geometry, "modelName")), "scene", ""};
    return takeTheOnlyOne(warp, geometry);
}

ModelInUse chooseModel(const HPlug& mesh, const ModelOption& option) {
    for (const HObject& node : nodesOfType("neuralWarp")) {
        const Warp warp = Warp::find(nodeName(node));
        for (const WarpGeometry& geometry : warp.geometries)
            if (geometry.output == mesh)
                return chooseModel(warp, geometry, option);
    }
    return {};
}

} // namespace quarn
