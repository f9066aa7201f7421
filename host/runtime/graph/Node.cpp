// SPDX-License-Identifier: Apache-2.0
#include "graph/Node.h"

#include "core/apiCall.h"
#include "openquarn_app/Messages.h"

#include <stdexcept>
#include <utility>

namespace OpenQuarn {
namespace {

thread_local std::shared_ptr<Node> constructing;

} // namespace

const std::shared_ptr<Node>& nodeUnderConstruction() {
    return constructing;
}

NodeData::NodeData(Node& dataNode, Context* dataContext)
    : node(dataNode)
    , context(dataContext) {
    const auto& fields = node.type().fields();
    slots.reserve(fields.size());
    for (const std::unique_ptr<Field>& field : fields) {
        slots.push_back(std::make_shared<Slot>(*field, this, nullptr, false, 0U));
        if (field->computed)
            slots.back()->markDirty();
    }
    if (node.type().makeFilterState)
        filterState = node.type().makeFilterState(*this);
}

NodeData::~NodeData() {
    bury();
}

void NodeData::bury() {
    filterState.reset();
    for (const std::shared_ptr<Slot>& slot : slots)
        slot->detach();
    slots.clear();
}

std::shared_ptr<Slot> NodeData::slot(const Field& field) const {
    if (isGone())
        return nullptr;
    if (!field.parent)
        return slots[field.position];
    const std::shared_ptr<Slot> parent = slot(*field.parent);
    return parent ? parent->child(field) : nullptr;
}

Node::Node(Graph& nodeGraph, std::shared_ptr<const NodeClass> nodeType, std::string nodeName)
    : graph_(nodeGraph)
    , type_(std::move(nodeType))
    , name_(std::move(nodeName))
    , data_(std::make_shared<NodeData>(*this, nullptr)) {}

Node::~Node() {
    if (isAlive())
        bury();
}

bool Node::isKind(HFn::Type type) const {
    if (type == HFn::kDependencyNode || type == kind())
        return true;
    return type == HFn::kPluginNode && !type_->plugin.empty();
}

void Node::createUserNode() {
    if (!type_->creator)
        throw std::runtime_error("node type '" + type_->name + "' cannot be created by itself");
    // the creator may create other nodes before its own
    const std::shared_ptr<Node> outer = std::exchange(constructing, std::static_pointer_cast<Node>(shared_from_this()));
    const HStatus status = callPlugin(*this, "creator", [&]() -> HStatus {
        user_.reset(type_->creator());
        return HStatus::kSuccess;
    });
    constructing = outer;
    if (!user_ || status.error())
        throw std::runtime_error("the creator of node type '" + type_->name + "' gave no node");
}

void Node::runPostConstructor() {
    const HStatus status = callPlugin(*this, "postConstructor", [&]() -> HStatus {
        user_->postConstructor();
        return HStatus::kSuccess;
    });
    if (status.error())
        throw std::runtime_error("node '" + name() + "' was not created: " + status.errorString().asStdString());
}

void Node::bury() {
    if (data_->filterState)
        data_->filterState->nodeIsGoing();
    user_.reset(); // its destructor still sees the node
    alive_.store(false, std::memory_order_release);
    callbacks.clear();
    data_->bury();
}

HStatus pluginException(const Node& node, const char* function) noexcept {
    HStatus status = statusOfException(function);
    try {
        showMessage(Severity::error, node.name() + ": " + status.errorString().asStdString());
    } catch (...) {
        showMessage(Severity::error, "a plug-in's function failed, and there is no memory to say which");
    }
    return status;
}

} // namespace OpenQuarn
