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

/// While it lives, this process is where the scene is: its current directory is the folder of the scene's file, and the
/// caller's folder while there is none. What is relative in a scene counts from there, so that a folder can be moved;
/// the deformer, for one, opens its modelRoot as the system does. One at a time. Thread: main.
class SceneFolder {
public:
    SceneFolder();
    ~SceneFolder();
    SceneFolder(const SceneFolder&) = delete;
    SceneFolder& operator=(const SceneFolder&) = delete;

private:
    std::filesystem::path before_;
};

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

    /// `scene` counts from the caller's folder. Answers with what the host warned of meanwhile, each beginning with the
    /// file's name; its message sink has got them too.
    std::vector<std::string> open(const std::filesystem::path& scene);
    /// Moves the scene to the folder of that path first.
    void save(const std::filesystem::path& scene);
    /// For a scene that is to be saved in another folder, and gets names of files before: from now on they count from
    /// there, and those that it has are named anew (OpenQuarn::moveScene). `folder` counts from the caller's folder;
    /// one that does not exist is made by save().
    void moveTo(const std::filesystem::path& folder);
    OpenQuarn::Session& host() { return session_; }

private:
    struct Threads;
    SceneFolder folder_;
    OpenQuarn::Session session_;
    std::unique_ptr<Threads> threads_;
};

/// Throws std::runtime_error, which says what to do, when the path ends as that of a character's file does.
void requireNoCharacter(const std::filesystem::path& scene);

/// As it is seen from the folder in which the program was started, the caller's, whatever scene was opened since.
std::filesystem::path absolutePath(const std::filesystem::path& path);

} // namespace quarn
