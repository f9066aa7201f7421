// SPDX-License-Identifier: Apache-2.0
// A node of the scene.
#pragma once

#include "graph/Slot.h"
#include "openquarn/HNodeMessage.h"
#include "types/NodeClass.h"

#include <atomic>
#include <memory>
#include <shared_mutex>
#include <string>
#include <vector>

namespace OpenQuarn {

class Context;
class Graph;
class Node;

/// Stands for the scene's own data wherever a context is asked for.
inline constexpr Context* normalContext = nullptr;

/// What the host keeps for a geometry filter beside its attributes, in one context.
class FilterState {
public:
    virtual ~FilterState() = default;
    FilterState(const FilterState&) = delete;
    FilterState& operator=(const FilterState&) = delete;

    /// Called for each slot of the node that has another value or has become dirty, before what depends on it becomes
    /// dirty. Thread: main.
    virtual void changed(Slot& slot) = 0;
    /// Called before that for a slot that was set, connected or disconnected itself, or that somebody asked to be made
    /// anew; not for one whose new value comes along a connection. Thread: main.
    virtual void edited(Slot& slot) = 0;
    /// Everything that is connected may have another value. Thread: main.
    virtual void connectionsChanged() = 0;
    /// The node will be buried: what needs it for its own end has to end now. Thread: main.
    virtual void nodeIsGoing() = 0;

protected:
    FilterState() = default;
};

/// The values of a node in one context.
class NodeData : public std::enable_shared_from_this<NodeData> {
public:
    NodeData(Node& dataNode, Context* dataContext);
    ~NodeData();
    NodeData(const NodeData&) = delete;
    NodeData& operator=(const NodeData&) = delete;

    Node& node;
    Context* const context;                   ///< null for the normal one
    std::vector<std::shared_ptr<Slot>> slots; ///< of the type's top-level fields
    mutable std::shared_mutex arrayMutex;     ///< see arrayLock.h
    std::unique_ptr<FilterState> filterState; ///< null for nodes that are no geometry filters

    /// The slot of a field; null below an array, where an element has to be chosen first, and when the node has gone.
    std::shared_ptr<Slot> slot(const Field& field) const;
    /// True once the node has gone: `node` may not be looked at any more.
    bool isGone() const { return slots.empty(); }
    /// Cuts all slots off.
    void bury();
};

class Node final : public Object {
public:
    struct Callback {
        HCallbackId id;
        HNodeMessage::HAttributeChangedFunction function;
        void* clientData;
    };

    Node(Graph& nodeGraph, std::shared_ptr<const NodeClass> nodeType, std::string nodeName);
    ~Node() override;
    HFn::Type kind() const override { return type_->kind; }
    bool isKind(HFn::Type type) const override;
    bool isAlive() const override { return alive_.load(std::memory_order_acquire); }

    const std::string& name() const { return name_; }
    Graph& graph() const { return graph_; }
    const NodeClass& type() const { return *type_; }
    const std::shared_ptr<const NodeClass>& typePointer() const { return type_; }
    HPxNode* userNode() const { return user_.get(); }
    /// For calls: what they run on stays although they delete the node.
    const std::shared_ptr<HPxNode>& userNodePointer() const { return user_; }
    const std::shared_ptr<NodeData>& data() const { return data_; }

    /// Run the creator and postConstructor(); throw std::runtime_error when the creator gives no node, or when either
    /// throws.
    void createUserNode();
    void runPostConstructor();
    /// Takes the plug-in's object and all values away: handles see the node as gone.
    void bury();

    std::vector<Callback> callbacks; ///< in order of registration
    std::atomic<unsigned> computes{0};
    /// What the scene file says of it that this host does not know: kept for the next save.
    std::string unknownFileContent;

private:
    friend class Graph;
    Graph& graph_;
    std::shared_ptr<const NodeClass> type_;
    std::string name_;
    std::shared_ptr<NodeData> data_;
    std::shared_ptr<HPxNode> user_;
    std::atomic<bool> alive_{true};
};

/// Runs `call` on the plug-in's side of a node; what it throws becomes a failing status and a message that names node
/// and function.
template <class Call>
HStatus callPlugin(const Node& node, const char* function, Call&& call) noexcept;

/// The node that HPxNode's constructor belongs to, on the thread that creates one.
const std::shared_ptr<Node>& nodeUnderConstruction();

HStatus pluginException(const Node& node, const char* function) noexcept;

template <class Call>
HStatus callPlugin(const Node& node, const char* function, Call&& call) noexcept {
    try {
        // it may delete its own node
        // NOLINTNEXTLINE(performance-unnecessary-copy-initialization)
        const std::shared_ptr<HPxNode> kept(node.userNodePointer());
        return call();
    } catch (...) {
        return pluginException(node, function);
    }
}

} // namespace OpenQuarn
