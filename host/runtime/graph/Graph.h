// SPDX-License-Identifier: Apache-2.0
// The nodes of the scene and their connections.
#pragma once

#include "graph/Node.h"
#include "openquarn/HStatus.h"

#include <cstdint>
#include <map>
#include <memory>
#include <mutex>
#include <string>
#include <unordered_map>
#include <unordered_set>
#include <vector>

namespace OpenQuarn {

/// What a scene file says that this host does not know: kept with the scene for the next save. Made by the scene
/// reader.
class KeptFileContent {
public:
    KeptFileContent() = default;
    virtual ~KeptFileContent() = default;
    KeptFileContent(const KeptFileContent&) = delete;
    KeptFileContent& operator=(const KeptFileContent&) = delete;
};

/// Thread: main, outside of evaluations, except where a function says otherwise. What can fail throws
/// std::invalid_argument or std::runtime_error with a sentence that names the thing and the value.
class Graph {
public:
    Graph();
    ~Graph();
    Graph(const Graph&) = delete;
    Graph& operator=(const Graph&) = delete;

    /// The scene that everything works on which names no other. Null without a session.
    static Graph* current();
    /// Makes it that one; null for none. Answers with the one of before.
    static Graph* setCurrent(Graph* graph) noexcept;
    /// All that there are: a process has several when scenes lie side by side.
    static const std::vector<Graph*>& all();

    // --- nodes ---
    /// `name` empty: the type's name and the first number that is free. With a name that is taken, a number is added.
    std::shared_ptr<Node> createNode(const std::shared_ptr<const NodeClass>& type, const std::string& name = {});
    void deleteNode(Node& node);
    void renameNode(Node& node, const std::string& name);
    /// Null when there is none.
    std::shared_ptr<Node> find(const std::string& name) const;
    /// In order of creation.
    std::vector<std::shared_ptr<Node>> nodes() const;
    std::size_t nodeCount() const { return byName_.size(); }
    /// Number of nodes of a type.
    std::size_t nodeCount(const NodeClass& type) const;
    /// Deletes all nodes but the time node, which is set to `time` and named "time1" again; forgets what was kept of a
    /// scene file.
    void clear(double time);
    const std::shared_ptr<Node>& timeNode() const { return timeNode_; }
    /// Keeps a name from being given to a node: a node of the scene file that cannot be created has it.
    void reserveName(const std::string& name) { reservedNames_.insert(name); }
    std::unique_ptr<KeptFileContent> keptFileContent;

    // --- connections ---
    /// Why the two cannot be connected, as a sentence naming both; empty when they can. `checkCycle` false leaves out
    /// the walk through what depends on the destination.
    std::string refusal(Slot& source, Slot& destination, bool checkCycle = true) const;
    /// True when a connection ends at the slot, above it or below it.
    static bool isConnectedInto(const Slot& destination);
    void connect(Slot& source, Slot& destination, bool checkCycle = true);
    /// Breaks the connection into `destination`; its value then does as the attribute says.
    void disconnect(Slot& destination);
    /// Destinations whose connection closes a cycle; none when there is no cycle. Breaking them may leave cycles that
    /// share a part with those, so ask again afterwards. One walk over all nodes. A slot may be listed twice.
    std::vector<std::shared_ptr<Slot>> cycleClosers() const;

    // --- values ---
    /// Why a plug's value cannot be set from outside: not writable, locked, connected; empty when it can.
    static std::string setRefusal(const Slot& slot);
    /// To be called after a value was set: makes dirty what depends on it and tells the callbacks.
    void valueSet(Slot& slot);
    void setLocked(Slot& slot, bool locked);
    /// Removes an element with its connections; fails when something locked or not writable is in the way.
    void removeElement(Slot& array, unsigned index);
    /// Tells the callbacks of a node. `other` null: none.
    void notify(Slot& slot, int mask, const Slot* other = nullptr);

    // --- callbacks ---
    /// No two scenes give the same number.
    HCallbackId addCallback(Node& node, HNodeMessage::HAttributeChangedFunction function, void* clientData);
    /// False when it is not one of this scene.
    bool removeCallback(HCallbackId id);

    // --- time ---
    double time() const { return time_; }
    void setTime(double time);
    /// Writes a time into data of the time node; nothing for other nodes.
    void setTimeIn(NodeData& data, double time) const;

    // --- what can be observed ---
    /// From now on, names of plugs are added to `plugs` in the order in which they become dirty; null ends it.
    void observeDirty(std::vector<std::string>* plugs) { dirtyPlugs_ = plugs; }
    void recordDirty(const Slot& slot);
    /// The same for the plugs that are computed. Thread of recordCompute(): any.
    void observeComputes(std::vector<std::string>* plugs);
    void recordCompute(const Slot& slot);

private:
    std::string freeName(const std::string& base);
    bool isTaken(const std::string& name) const { return byName_.count(name) + reservedNames_.count(name) != 0; }
    void insert(const std::shared_ptr<Node>& node);
    void disconnectAll(Slot& slot);
    void breakLink(Slot& source, Slot& destination);
    void afterDisconnect(Slot& destination);
    void tellNodes(Slot& source, Slot& destination, bool made);

    std::map<std::uint64_t, std::shared_ptr<Node>> byOrder_;
    struct Entry {
        std::shared_ptr<Node> node;
        std::uint64_t order;
    };
    std::unordered_map<std::string, Entry> byName_;
    std::unordered_set<std::string> reservedNames_;
    std::unordered_map<std::string, unsigned> nextNumber_; // where the search for a free name goes on
    std::unordered_map<const NodeClass*, std::size_t> typeCounts_;
    std::uint64_t nextOrder_ = 1;
    std::unordered_map<HCallbackId, std::weak_ptr<Node>> callbackNodes_;
    std::shared_ptr<Node> timeNode_;
    double time_ = 1.0;
    std::vector<std::string>* dirtyPlugs_ = nullptr;
    std::mutex computesMutex_;
    std::atomic<std::vector<std::string>*> computedPlugs_{nullptr};
};

/// Throws std::runtime_error when there is no scene.
Graph& currentGraph();

/// Of whichever scene the callback is. Throws std::invalid_argument when it is of none, std::runtime_error without a
/// scene.
void removeCallback(HCallbackId id);

} // namespace OpenQuarn
