// SPDX-License-Identifier: Apache-2.0
#include "quarn/scene/SceneSession.h"

#include "openquarn_app/Plugins.h"
#include "openquarn_app/SceneFile.h"
#include "rig/registration.h"

#include <CLI/CLI.hpp>
#include <oneapi/tbb/global_control.h>

#include <cstdlib>
#include <optional>
#include <stdexcept>

namespace quarn {
namespace {

namespace fs = std::filesystem;

// where the program was started; asked for first thing, by the static below
fs::path startFolder() {
    static const fs::path folder = fs::current_path();
    return folder;
}
[[maybe_unused]] const fs::path rememberStart = startFolder();

std::vector<fs::path> placesOfDeformer() {
    std::vector<fs::path> places;
    if (const char* given = std::getenv("NEURALWARP_PLUGIN"); given != nullptr && *given != '\0')
        return {absolutePath(given)};
    const fs::path folder = fs::read_symlink("/proc/self/exe").parent_path();
    // beside the program in a build folder; in an installed tree; the same for programs of tests
    places.push_back(folder.parent_path() / "plugin" / "neuralWarp.so");
    places.push_back(folder / QUARN_PLUGINS_FROM_BIN / "neuralWarp.so");
    return places;
}

std::optional<fs::path> findDeformer() {
    for (const fs::path& place : placesOfDeformer())
        if (fs::exists(place))
            return place;
    return {};
}

} // namespace

struct SceneSession::Threads {
    explicit Threads(int count)
        : limit(oneapi::tbb::global_control::max_allowed_parallelism, static_cast<std::size_t>(count)) {}
    oneapi::tbb::global_control limit;
};

fs::path absolutePath(const fs::path& path) {
    return path.empty() ? path : (startFolder() / path).lexically_normal();
}

std::string pathForScene(const fs::path& file, const fs::path& folder) {
    const fs::path relative = file.lexically_relative(folder);
    const bool outside = relative.empty() || *relative.begin() == "..";
    return (outside ? file : relative).generic_string();
}

fs::path deformerPlugin() {
    std::string looked;
    for (const fs::path& place : placesOfDeformer())
        looked += (looked.empty() ? "" : ", ") + place.lexically_normal().string();
    if (const std::optional<fs::path> found = findDeformer())
        return *found;
    throw std::runtime_error("the plug-in neuralWarp.so was not found; looked at: " + looked +
                             ". Set NEURALWARP_PLUGIN to its path");
}

void loadPlugins(const std::vector<std::string>& further, bool deformerRequired) {
    OpenQuarn::addPlugin("quarnRig", rig::registerNodes, rig::deregisterNodes);
    if (deformerRequired || findDeformer())
        OpenQuarn::loadPlugin(deformerPlugin());
    for (const std::string& path : further)
        OpenQuarn::loadPlugin(absolutePath(path));
}

void addSceneOptions(CLI::App& command, SceneOptions& options) {
    command.add_option("SCENE", options.scene, "The scene file")->required();
    command.add_option("-p,--plugin", options.plugins, "Load a further plug-in first; may be repeated")
        ->type_name("PATH")
        ->allow_extra_args(false);
    command.add_option("--threads", options.threads, "Threads of evaluation; 0 for all")
        ->check(CLI::Range(0, 1024))
        ->capture_default_str();
}

SceneSession::SceneSession(const std::vector<std::string>& plugins, int threads)
    : threads_(threads > 0 ? std::make_unique<Threads>(threads) : nullptr)
    , folderBefore_(fs::current_path()) {
    loadPlugins(plugins, true);
}

SceneSession::SceneSession(const SceneOptions& options)
    : SceneSession(options.plugins, options.threads) {
    open(options.scene);
}

SceneSession::~SceneSession() {
    std::error_code gone; // the folder of before may have been removed: then there is nowhere to go back to
    fs::current_path(folderBefore_, gone);
}

void SceneSession::open(const fs::path& scene) {
    const fs::path path = absolutePath(scene);
    const OpenQuarn::FileOutcome outcome = OpenQuarn::openScene(path);
    if (!outcome)
        throw std::runtime_error(outcome.error);
    sceneFolder_ = path.parent_path();
    fs::current_path(sceneFolder_);
}

void SceneSession::moveTo(const fs::path& folder) {
    if (sceneFolder_.empty() || folder == sceneFolder_)
        return;
    std::vector<OpenQuarn::Relocation> moved;
    for (const OpenQuarn::ExternalContent& content : OpenQuarn::externalContent()) {
        const fs::path file = (sceneFolder_ / content.unresolved).lexically_normal();
        if (!content.unresolved.empty() && fs::path(content.unresolved).is_relative() && fs::exists(file))
            moved.push_back({content.node, content.key, pathForScene(file, folder)});
    }
    if (const OpenQuarn::FileOutcome outcome = OpenQuarn::relocate(moved); !outcome)
        throw std::runtime_error(outcome.error);
    fs::current_path(folder);
    sceneFolder_ = folder;
}

void SceneSession::save(const fs::path& scene) {
    if (const fs::path folder = absolutePath(scene).parent_path(); fs::is_directory(folder))
        moveTo(folder); // where there is no folder, saving says so
    const OpenQuarn::FileOutcome outcome = OpenQuarn::saveScene(absolutePath(scene));
    if (!outcome)
        throw std::runtime_error(outcome.error);
}

} // namespace quarn
