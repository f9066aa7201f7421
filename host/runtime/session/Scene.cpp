// SPDX-License-Identifier: Apache-2.0
#include "openquarn_app/Scene.h"

#include "core/threads.h"
#include "graph/Graph.h"
#include "services/SceneFileState.h"

#include <utility>

namespace OpenQuarn {

struct Scene::Impl {
    Graph graph;
    SceneFileNames file; ///< while it is not current
};

struct Scene::Current::Impl {
    explicit Impl(Scene::Impl& of)
        : scene(of)
        , previous(Graph::setCurrent(&of.graph))
        , previousFile(exchangeSceneFile(std::move(of.file))) {}
    ~Impl() {
        scene.file = exchangeSceneFile(std::move(previousFile));
        Graph::setCurrent(previous);
    }
    Impl(const Impl&) = delete;
    Impl& operator=(const Impl&) = delete;

    MainThreadScope thread;
    Scene::Impl& scene;
    Graph* previous;
    SceneFileNames previousFile;
};

Scene::Current::Current(Scene& scene) {
    currentGraph(); // throws without a session
    impl_ = std::make_unique<Impl>(*scene.impl_);
}
Scene::Current::~Current() = default;

Scene::Scene() {
    currentGraph();
    impl_ = std::make_unique<Impl>();
}

Scene::~Scene() {
    if (!Graph::current())
        return; // the session has emptied it
    const Current whileEmptied(*this);
    impl_->graph.clear(impl_->graph.time());
}

} // namespace OpenQuarn
