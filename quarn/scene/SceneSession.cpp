// SPDX-License-Identifier: Apache-2.0
#include "quarn/scene/SceneSession.h"

#include "openquarn_app/Interrupt.h"
#include "openquarn_app/Plugins.h"
#include "openquarn_app/SceneFile.h"
#include "openquarn_app/Workspace.h"
#include "quarn/console/Log.h"
#include "quarn/console/interrupt.h"
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

// decision 0061
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

void must(const OpenQuarn::FileOutcome& outcome) {
    if (!outcome)
        throw std::runtime_error(outcome.error);
}

void load(const fs::path& path) {
    Stage stage([&] { return "loading plug-in " + path.lexically_normal().string(); });
    const std::string name = OpenQuarn::loadPlugin(path);
    stage.result([&] {
        const OpenQuarn::PluginInfo plugin = OpenQuarn::pluginInfo(name);
        return name + " " + plugin.version + ", " + std::to_string(plugin.nodeTypes.size()) + " node types";
    });
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
        load(deformerPlugin());
    for (const std::string& path : further)
        load(absolutePath(path));
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

SceneFolder::SceneFolder()
    : before_(fs::current_path()) {
    OpenQuarn::Workspace::setCallersFolder(startFolder());
    OpenQuarn::setSceneFolderSink([](const fs::path& folder) {
        log([&] { return "paths of the scene count from " + (folder.empty() ? startFolder() : folder).string(); });
        // the caller's folder may have been removed, and a scene's be made only when it is saved, which tells again
        std::error_code notThere;
        fs::current_path(folder.empty() ? startFolder() : folder, notThere);
    });
}

SceneFolder::~SceneFolder() {
    OpenQuarn::setSceneFolderSink({});
    OpenQuarn::Workspace::setCallersFolder({});
    std::error_code gone;
    fs::current_path(before_, gone);
}

SceneSession::SceneSession(const std::vector<std::string>& plugins, int threads)
    : threads_(threads > 0 ? std::make_unique<Threads>(threads) : nullptr) {
    whenInterrupted([] { OpenQuarn::setInterrupted(true); });
    loadPlugins(plugins, true);
}

SceneSession::SceneSession(const SceneOptions& options)
    : SceneSession(options.plugins, options.threads) {
    open(options.scene);
}

SceneSession::~SceneSession() = default;

void requireNoCharacter(const fs::path& scene) {
    for (const char* ending : {".glb", ".gltf", ".fbx", ".dae"})
        if (scene.extension() == ending)
            throw std::runtime_error(scene.string() + " is a character, not a scene: quarn import " + scene.string() +
                                     " -o " + scene.stem().string() + ".json makes a scene of it");
}

std::vector<std::string> SceneSession::open(const fs::path& scene) {
    requireNoCharacter(scene);
    Stage stage([&] { return "opening scene " + absolutePath(scene).string(); });
    OpenQuarn::FileOutcome outcome = OpenQuarn::openScene(absolutePath(scene));
    must(outcome);
    stage.result([&] { return std::to_string(session_.nodeCount()) + " nodes"; });
    return std::move(outcome.warnings);
}

void SceneSession::moveTo(const fs::path& folder) {
    must(OpenQuarn::moveScene(absolutePath(folder)));
}

void SceneSession::save(const fs::path& scene) {
    const Stage stage([&] { return "saving scene " + absolutePath(scene).string(); });
    must(OpenQuarn::saveScene(absolutePath(scene)));
}

} // namespace quarn
