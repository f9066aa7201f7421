// SPDX-License-Identifier: Apache-2.0
// The host with quarn's own nodes and the deformer, and the scene that a command works on.
#pragma once

#include "openquarn_app/Session.h"

#include <filesystem>
#include <memory>
#include <string>
#include <vector>

namespace CLI {
class App;
}

namespace quarn {

/// What a command that works on a scene is told by its flags; see addSceneOptions().
struct SceneOptions {
    std::filesystem::path scene;
    std::vector<std::string> plugins; ///< paths of further plug-ins
    int threads = 0;                  ///< of evaluation; 0 for as many as the machine has
};

/// Adds SCENE, --plugin and --threads to a sub-command. `options` must outlive it.
void addSceneOptions(CLI::App& command, SceneOptions& options);

/// The plug-in that brings the deformer: $NEURALWARP_PLUGIN, or where this program was built, or installed, beside it.
/// Throws std::runtime_error that names all of these places when it is at none.
std::filesystem::path deformerPlugin();

/// Registers the rig nodes, and loads the deformer and further plug-ins, in the session that is open. Without
/// `deformerRequired`, a deformer that is at none of its places is left out. Throws as OpenQuarn::loadPlugin() does.
/// Thread: main.
void loadPlugins(const std::vector<std::string>& further, bool deformerRequired);

/// An open host with the rig nodes, the deformer and further plug-ins; one at a time in a process. Errors are
/// std::runtime_error with the sentence for the user. Thread: main.
class SceneSession {
public:
    /// With an empty scene.
    explicit SceneSession(const std::vector<std::string>& plugins = {}, int threads = 0);
    /// With the scene of the options open.
    explicit SceneSession(const SceneOptions& options);
    ~SceneSession();
    SceneSession(const SceneSession&) = delete;
    SceneSession& operator=(const SceneSession&) = delete;

    /// Opens a scene, and goes to its folder: what is relative in a scene counts from there, so that a folder can be
    /// moved. Paths of the command line must have been made absolute before (`absolutePath`).
    void open(const std::filesystem::path& scene);
    /// Moves the scene to the folder of that path first.
    void save(const std::filesystem::path& scene);
    /// For a scene that has been opened and is to be saved in another folder: goes there, and has the nodes name the
    /// files that lie in or below the former folder so that they find them. `folder` absolute; the same one is fine.
    void moveTo(const std::filesystem::path& folder);
    OpenQuarn::Session& host() { return session_; }

private:
    struct Threads;
    OpenQuarn::Session session_;
    std::unique_ptr<Threads> threads_;
    std::filesystem::path folderBefore_;
    std::filesystem::path sceneFolder_; ///< empty until a scene is opened
};

/// As it is seen from the folder in which the program was started, whatever SceneSession::open() did since.
std::filesystem::path absolutePath(const std::filesystem::path& path);

/// How a scene in `folder` (absolute) names a file: relative when the file lies in that folder or below it, so that the
/// folder can be moved; absolute otherwise.
std::string pathForScene(const std::filesystem::path& file, const std::filesystem::path& folder);

} // namespace quarn
