// SPDX-License-Identifier: Apache-2.0
#include "plugin/controls/controlNodesPlugin.h"

#include "controls/controlCollectorNode.h"
#include "controls/matrixConverterNode.h"
#include "controls/orthoAxisFromMatrixArray.h"
#include "messages/catalogue.h"
#include "openquarn/HFnPlugin.h"
#include "openquarn_app/Plugins.h"

#include <stdexcept>

namespace {

void require(const HStatus& status) {
    if (status.error())
        throw std::runtime_error(status.errorString().asStdString());
}

template <class Node>
void registerNode(HFnPlugin& plugin) {
    require(plugin.registerNode(Node::typeName, Node::id, Node::create, Node::initialize));
}

HStatus initialize(HObject object) {
    HFnPlugin plugin(object, "tests", "1", "Any");
    require(plugin.registerUIStrings(neuralWarp::registerCatalogue, ""));
    registerNode<neuralWarp::controlCollectorNode>(plugin);
    registerNode<neuralWarp::orthoAxisFromMatrixArray>(plugin);
    registerNode<neuralWarp::matrixConverterNode>(plugin);
    return HStatus::kSuccess;
}

HStatus uninitialize(HObject object) {
    HFnPlugin plugin(object, "tests", "1", "Any");
    for (const HTypeId& id : {neuralWarp::controlCollectorNode::id, neuralWarp::orthoAxisFromMatrixArray::id,
                              neuralWarp::matrixConverterNode::id})
        require(plugin.deregisterNode(id));
    return HStatus::kSuccess;
}

} // namespace

void addControlNodes() {
    OpenQuarn::addPlugin("controlNodes", initialize, uninitialize);
}
