// SPDX-License-Identifier: Apache-2.0
// A scene that Python has opened, and a piece of work on it.
#pragma once

#include "openquarn/HPlug.h"
#include "openquarn_app/Scene.h"
#include "python/scene/Host.h"
#include "quarn/scene/ControlReader.h"
#include "quarn/scene/Warp.h"

#include <pybind11/pybind11.h>

#include <filesystem>
#include <map>
#include <memory>
#include <mutex>
#include <string>
#include <vector>

namespace python {

/// Thread: any that holds the interpreter's lock. All but close() and what is said of the file is to be called inside
/// of a Visit.
class OpenScene {
public:
    /// Throws std::invalid_argument, naming the file and what is wrong with it, and as Host::instance() does. `path`
    /// absolute, of a file that is there.
    explicit OpenScene(const std::filesystem::path& path);
    ~OpenScene();
    OpenScene(const OpenScene&) = delete;
    OpenScene& operator=(const OpenScene&) = delete;

    /// Deletes its nodes; done once.
    void close();
    /// Those that are still open; for the end of the interpreter.
    static std::vector<OpenScene*>& allOpen();

    bool isClosed() const { return !scene_; }
    const std::filesystem::path& path() const { return path_; }
    const std::vector<std::string>& warnings() const { return warnings_; } ///< of opening it
    /// What was warned of since the last call.
    std::vector<std::string> takeMessages();

    /// The deformer of that name, or the only one; kept from the first call on. Throws std::invalid_argument.
    const quarn::Warp& deformer(const std::string& name);
    /// Evaluates its control values, which stay there until the next call. Throws std::runtime_error.
    const std::vector<float>& controls(const std::string& deformer);
    /// A text as the plug takes it: a folder of models becomes absolute, as the deformer opens it from the current
    /// folder of the process.
    std::string textFor(const HPlug& plug, const std::string& text) const;

private:
    friend class Visit;
    struct Deformer {
        quarn::Warp warp;
        quarn::ControlReader reader{warp};
    };
    Deformer& keptDeformer(const std::string& name);
    void open();
    void placeModelRoots();
    /// Sets modelRoot, whereupon the deformer opens its models.
    void placeModelRoot(const HObject& deformer) const;

    std::filesystem::path path_;
    std::unique_ptr<OpenQuarn::Scene> scene_;
    std::map<std::string, std::unique_ptr<Deformer>> deformers_;
    std::vector<std::string> warnings_, messages_;
};

/// As long as it lives, the calling thread works in the host, on this scene: no other thread does. Errors that were
/// shown and not thrown become messages of the scene. They nest.
class Visit {
public:
    /// Waits for the thread that is in the host. Throws std::runtime_error for a scene that is closed.
    explicit Visit(OpenScene& scene);
    ~Visit();
    Visit(const Visit&) = delete;
    Visit& operator=(const Visit&) = delete;

    /// Evaluates the plug, without the interpreter's lock. Throws std::runtime_error, naming the plug, when that fails,
    /// and when the host or the deformer showed an error meanwhile; so it does again in the next call.
    void evaluate(const HPlug& plug);
    /// Runs work that evaluates `plug` in the same way.
    template <class Work>
    void evaluating(const HPlug& plug, const Work& work) {
        host_.errors().clear();
        {
            const pybind11::gil_scoped_release released;
            work();
        }
        requireNoErrors(plug);
    }

private:
    void requireNoErrors(const HPlug& plug);

    std::unique_lock<std::recursive_mutex> lock_;
    OpenScene& scene_;
    Host& host_;
    OpenQuarn::Scene::Current current_;
    std::vector<std::string>* previousWarnings_;
};

} // namespace python
