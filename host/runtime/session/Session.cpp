// SPDX-License-Identifier: Apache-2.0
#include "openquarn_app/Session.h"

#include "core/threads.h"
#include "geometry/filterAttributes.h"
#include "gpu/Device.h"
#include "graph/Graph.h"
#include "plugins/PluginTable.h"
#include "services/SceneFileState.h"

#include <stdexcept>

namespace OpenQuarn {
namespace {

constexpr double firstFrame = 1.0;

// in the order in which they were made, the session's own at last: it is the one that plug-ins are left with
void emptyAll(Graph& own) {
    for (Graph* graph : Graph::all())
        if (graph != &own)
            graph->clear(firstFrame);
    own.clear(firstFrame);
}

bool isOpen = false;

} // namespace

struct Session::Impl {
    Impl() { Graph::setCurrent(&graph); }
    Graph graph;
};

Session::Session() {
    if (isOpen)
        throw std::runtime_error("there can be only one session at a time");
    setMainThread();
    registerGeometryNodes();
    impl_ = std::make_unique<Impl>();
    isOpen = true;
}

Session::~Session() {
    setMainThread();
    emptyAll(impl_->graph);
    setCurrentSceneFile({});
    PluginTable::instance().unloadAll();
    closeDevice();
    isOpen = false;
}

void Session::newScene() {
    currentGraph().clear(firstFrame);
    setCurrentSceneFile({});
}

std::vector<HObject> Session::nodes() const {
    std::vector<HObject> objects;
    objects.reserve(nodeCount());
    for (const std::shared_ptr<Node>& node : currentGraph().nodes())
        objects.push_back(Access::object(node));
    return objects;
}

std::size_t Session::nodeCount() const {
    return currentGraph().nodeCount();
}
double Session::time() const {
    return currentGraph().time();
}
void Session::setTime(double frame) {
    currentGraph().setTime(frame);
}

} // namespace OpenQuarn
