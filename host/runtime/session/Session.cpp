// SPDX-License-Identifier: Apache-2.0
#include "openquarn_app/Session.h"

#include "core/threads.h"
#include "geometry/filterAttributes.h"
#include "gpu/Device.h"
#include "graph/Graph.h"
#include "plugins/PluginTable.h"
#include "services/SceneFileState.h"

namespace OpenQuarn {
namespace {

constexpr double firstFrame = 1.0;

} // namespace

struct Session::Impl {
    Graph graph;
};

Session::Session() {
    setMainThread();
    registerGeometryNodes();
    impl_ = std::make_unique<Impl>();
}

Session::~Session() {
    newScene();
    PluginTable::instance().unloadAll();
    closeDevice();
}

void Session::newScene() {
    impl_->graph.clear(firstFrame);
    setCurrentSceneFile({});
}

std::vector<HObject> Session::nodes() const {
    std::vector<HObject> objects;
    objects.reserve(nodeCount());
    for (const std::shared_ptr<Node>& node : impl_->graph.nodes())
        objects.push_back(Access::object(node));
    return objects;
}

std::size_t Session::nodeCount() const {
    return impl_->graph.nodeCount();
}
double Session::time() const {
    return impl_->graph.time();
}
void Session::setTime(double frame) {
    impl_->graph.setTime(frame);
}

} // namespace OpenQuarn
