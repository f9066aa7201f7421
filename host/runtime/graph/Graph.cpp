// SPDX-License-Identifier: Apache-2.0
#include "graph/Graph.h"

#include "core/text.h"
#include "graph/dirty.h"
#include "graph/plugImpl.h"
#include "types/baseNodes.h"

#include <algorithm>
#include <stdexcept>
#include <utility>

namespace OpenQuarn {
namespace {

Graph* theGraph = nullptr;
std::vector<Graph*> allGraphs; // in order of creation
HCallbackId nextCallback = 1;  // of all graphs: the one who takes it back need not know whose it is

constexpr const char* timeNodeName = "time1";

// A connection that ends below the slot; null when there is none.
const Slot* connectedBelow(const Slot& slot) {
    const Slot* connected = nullptr;
    slot.forEachPart([&](const Slot& part) {
        if (!connected)
            connected = part.source() ? &part : connectedBelow(part);
    });
    return connected;
}

void unlock(Slot& slot) {
    slot.locked = false;
    slot.forEachPart([](Slot& part) { unlock(part); });
}

} // namespace

Graph* Graph::current() {
    return theGraph;
}

Graph* Graph::setCurrent(Graph* graph) noexcept {
    return std::exchange(theGraph, graph);
}

const std::vector<Graph*>& Graph::all() {
    return allGraphs;
}

Graph& currentGraph() {
    if (!theGraph)
        throw std::runtime_error("there is no scene: no session has been started");
    return *theGraph;
}

void removeCallback(HCallbackId id) {
    currentGraph();
    for (Graph* graph : allGraphs)
        if (graph->removeCallback(id))
            return;
    throw std::invalid_argument("there is no callback " + std::to_string(id));
}

Graph::Graph() {
    registerBaseNodes();
    timeNode_ = createNode(timeClass(), timeNodeName);
    setTimeIn(*timeNode_->data(), time_);
    allGraphs.push_back(this);
}

Graph::~Graph() {
    clear(time_);
    timeNode_->bury();
    allGraphs.erase(std::find(allGraphs.begin(), allGraphs.end(), this));
    if (theGraph == this)
        theGraph = nullptr;
}

// --- nodes ---

std::string Graph::freeName(const std::string& base) {
    unsigned& number = nextNumber_[base];
    std::string name;
    do {
        name = base + std::to_string(++number);
    } while (isTaken(name));
    return name;
}

void Graph::insert(const std::shared_ptr<Node>& node) {
    const std::uint64_t order = nextOrder_++;
    byOrder_.emplace(order, node);
    byName_.emplace(node->name(), Entry{node, order});
    ++typeCounts_[&node->type()];
}

std::shared_ptr<Node> Graph::createNode(const std::shared_ptr<const NodeClass>& type, const std::string& name) {
    if (!name.empty() && !isIdentifier(name))
        throw std::invalid_argument("'" + name + "' cannot name a node");
    if (!type->creator)
        throw std::invalid_argument("node type '" + type->name + "' cannot be created by itself");
    const bool asGiven = !name.empty() && !isTaken(name);
    auto node = std::make_shared<Node>(*this, type, asGiven ? name : freeName(name.empty() ? type->name : name));
    insert(node);
    try {
        node->createUserNode();
        node->runPostConstructor();
    } catch (...) {
        if (node->isAlive())
            deleteNode(*node);
        throw;
    }
    if (!node->isAlive())
        throw std::runtime_error("node '" + node->name() + "' was deleted while it was created");
    return node;
}

void Graph::deleteNode(Node& node) {
    const std::shared_ptr<Node> kept = find(node.name());
    if (kept.get() != &node)
        throw std::invalid_argument("node '" + node.name() + "' is not in the scene");
    if (&node == timeNode_.get())
        throw std::invalid_argument("the time node '" + node.name() + "' cannot be deleted");
    const std::vector<std::shared_ptr<Slot>> slots = node.data()->slots;
    for (const std::shared_ptr<Slot>& slot : slots)
        disconnectAll(*slot);
    if (!node.isAlive())
        return;                                   // who was told of a broken connection has deleted it
    const auto entry = byName_.find(node.name()); // or has renamed it
    for (const Node::Callback& callback : node.callbacks)
        callbackNodes_.erase(callback.id);
    byOrder_.erase(entry->second.order);
    byName_.erase(entry);
    --typeCounts_[&node.type()];
    node.bury();
}

void Graph::renameNode(Node& node, const std::string& name) {
    if (name == node.name())
        return;
    if (!isIdentifier(name))
        throw std::invalid_argument("'" + name + "' cannot name a node");
    if (isTaken(name))
        throw std::invalid_argument("there is a node named '" + name + "' already");
    const auto entry = byName_.find(node.name());
    if (entry == byName_.end())
        throw std::invalid_argument("node '" + node.name() + "' is not in the scene");
    Entry kept = entry->second;
    byName_.erase(entry);
    node.name_ = name;
    byName_.emplace(name, std::move(kept));
}

std::shared_ptr<Node> Graph::find(const std::string& name) const {
    const auto found = byName_.find(name);
    return found == byName_.end() ? nullptr : found->second.node;
}

std::vector<std::shared_ptr<Node>> Graph::nodes() const {
    std::vector<std::shared_ptr<Node>> all;
    all.reserve(byOrder_.size());
    for (const auto& [order, node] : byOrder_)
        all.push_back(node);
    return all;
}

std::size_t Graph::nodeCount(const NodeClass& type) const {
    const auto found = typeCounts_.find(&type);
    return found == typeCounts_.end() ? 0 : found->second;
}

void Graph::clear(double time) {
    std::vector<std::shared_ptr<Node>> all = nodes();
    // connections first, all at once: nobody is told, since nobody is left to tell
    const auto unlink = [](auto&& self, Slot& slot) -> void {
        slot.links.reset();
        slot.forEachPart([&](Slot& part) { self(self, part); });
    };
    for (const std::shared_ptr<Node>& node : all)
        for (const std::shared_ptr<Slot>& slot : node->data()->slots)
            unlink(unlink, *slot);
    std::reverse(all.begin(), all.end());
    for (const std::shared_ptr<Node>& node : all)
        if (node != timeNode_ && node->isAlive()) // one may have deleted others
            deleteNode(*node);
    nextNumber_.clear();
    reservedNames_.clear();
    keptFileContent.reset();
    timeNode_->unknownFileContent.clear();
    for (const std::shared_ptr<Slot>& slot : timeNode_->data()->slots)
        unlock(*slot);
    renameNode(*timeNode_, timeNodeName);
    setTime(time);
}

// --- connections ---

std::string Graph::refusal(Slot& source, Slot& destination, bool checkCycle) const {
    const Attribute& from = *source.field.attribute;
    const Attribute& to = *destination.field.attribute;
    const std::string both = "cannot connect '" + source.name() + "' to '" + destination.name() + "': ";
    if (!from.readable || !from.connectable)
        return both + "the source is not readable, or not connectable";
    if (!to.writable || !to.connectable)
        return both + "the destination is not writable, or not connectable";
    if (source.isArray() != destination.isArray())
        return both + "one is a whole array, the other is not";
    if (!to.takesValueOf(from))
        return both + "a " + from.typeName() + " does not fit a " + to.typeName();
    if (destination.locked)
        return both + "the destination is locked";
    for (const Slot* at = &destination; at; at = at->parent)
        if (const Slot* present = at->source())
            return both + "the destination is connected from '" + present->name() + "'";
    if (const Slot* part = connectedBelow(destination))
        return both + "'" + part->name() + "' is connected from '" + part->source()->name() + "'";
    if (checkCycle && to.kind() != HFn::kMessageAttribute && reaches(destination, source))
        return both + "the source depends on the destination";
    return {};
}

bool Graph::isConnectedInto(const Slot& destination) {
    for (const Slot* at = &destination; at; at = at->parent)
        if (at->source())
            return true;
    return connectedBelow(destination) != nullptr;
}

void Graph::connect(Slot& source, Slot& destination, bool checkCycle) {
    const std::string refused = refusal(source, destination, checkCycle);
    if (!refused.empty())
        throw std::invalid_argument(refused);
    for (Slot* end : {&source, &destination})
        if (!end->links)
            end->links = std::make_unique<Slot::Links>();
    source.links->destinations.push_back(&destination);
    destination.links->source = &source;
    makeDirty(destination);
    tellNodes(source, destination, true);
}

void Graph::breakLink(Slot& source, Slot& destination) {
    std::vector<Slot*>& all = source.links->destinations;
    all.erase(std::next(std::find(all.rbegin(), all.rend(), &destination)).base()); // the last ones are broken first
    destination.links->source = nullptr;
}

void Graph::disconnect(Slot& destination) {
    Slot* source = destination.source();
    if (!source)
        throw std::invalid_argument("'" + destination.name() + "' is not connected");
    const std::shared_ptr<Slot> keptSource = source->shared_from_this();
    const std::shared_ptr<Slot> kept = destination.shared_from_this();
    breakLink(*source, destination);
    tellNodes(*source, destination, false);
    if (destination.owner && !destination.source()) // who was told may have removed it, or connected it again
        afterDisconnect(destination);
}

void Graph::afterDisconnect(Slot& destination) {
    const HFnAttribute::DisconnectBehavior behavior = destination.field.attribute->onDisconnect;
    if (behavior == HFnAttribute::kDelete && destination.isElement && destination.parent) {
        removeElement(*destination.parent, destination.index);
        return;
    }
    if (behavior == HFnAttribute::kReset) {
        destination.reset();
    }
    destination.markClean();
    propagateFrom(destination);
}

void Graph::tellNodes(Slot& source, Slot& destination, bool made) {
    struct Side {
        Slot& slot;
        Slot& other;
        bool isSource;
    };
    const std::shared_ptr<Slot> keptSource = source.shared_from_this();
    const std::shared_ptr<Slot> keptDestination = destination.shared_from_this();
    for (const Side& side : {Side{source, destination, true}, Side{destination, source, false}}) {
        if (!side.slot.owner)
            continue;
        const auto node = std::static_pointer_cast<Node>(side.slot.owner->node.shared_from_this());
        if (HPxNode* user = node->userNode())
            callPlugin(*node, made ? "connectionMade" : "connectionBroken", [&] {
                return made ? user->connectionMade(makePlug(side.slot), makePlug(side.other), side.isSource)
                            : user->connectionBroken(makePlug(side.slot), makePlug(side.other), side.isSource);
            });
        const int direction = side.isSource ? 0 : HNodeMessage::kIncomingDirection;
        notify(side.slot,
               (made ? HNodeMessage::kConnectionMade : HNodeMessage::kConnectionBroken) | direction |
                   HNodeMessage::kOtherPlugSet,
               &side.other);
    }
}

void Graph::disconnectAll(Slot& slot) {
    const std::shared_ptr<Slot> kept = slot.shared_from_this();
    if (slot.source())
        disconnect(slot);
    // those of now: a plug-in that connects again does not keep us for ever
    std::vector<std::shared_ptr<Slot>> destinations;
    destinations.reserve(slot.links ? slot.links->destinations.size() : 0);
    if (slot.links)
        for (Slot* destination : slot.links->destinations)
            destinations.push_back(destination->shared_from_this());
    std::reverse(destinations.begin(), destinations.end());
    for (const std::shared_ptr<Slot>& destination : destinations)
        if (destination->source() == &slot)
            disconnect(*destination);
    std::vector<std::shared_ptr<Slot>> parts(slot.children());
    parts.reserve(parts.size() + slot.elements().size());
    slot.elements().forEach([&](unsigned, const std::shared_ptr<Slot>& part) { parts.push_back(part); });
    for (const std::shared_ptr<Slot>& part : parts)
        disconnectAll(*part);
}

namespace {

bool isPartOf(const Slot& part, const Slot& whole) {
    for (const Slot* at = &part; at; at = at->parent)
        if (at == &whole)
            return true;
    return false;
}

/// Depth first over slots, with a stack of its own: a chain may be as long as memory allows.
class CycleSearch {
public:
    void from(Slot& start) {
        if (places_.count(&start) == 0)
            enter(start, false);
        while (!stack_.empty()) {
            Frame& frame = stack_.back();
            if (frame.next == frame.dependents.size()) {
                places_[frame.slot] = done;
                stack_.pop_back();
                continue;
            }
            Slot& dependent = *frame.dependents[frame.next++];
            const bool connected = isConnection(*frame.slot, dependent);
            const auto place = places_.find(&dependent);
            if (place == places_.end())
                enter(dependent, connected);
            else if (place->second != done)
                addCloser(dependent, connected, place->second);
        }
    }

    std::vector<std::shared_ptr<Slot>> closers;

private:
    static constexpr std::size_t done = SIZE_MAX;
    static constexpr std::size_t none = SIZE_MAX;

    struct Frame {
        Slot* slot;
        std::size_t connected; // the highest frame up to here that was entered along a connection
        std::vector<Slot*> dependents;
        std::size_t next = 0;
    };

    static bool isConnection(const Slot& from, const Slot& to) {
        return to.source() && (isPartOf(*to.source(), from) || isPartOf(from, *to.source()));
    }

    void enter(Slot& slot, bool connected) {
        places_[&slot] = stack_.size();
        const std::size_t below = stack_.empty() ? none : stack_.back().connected;
        Frame frame{&slot, connected ? stack_.size() : below, {}};
        forEachDependent(slot, [&](Slot& dependent) { frame.dependents.push_back(&dependent); });
        stack_.push_back(std::move(frame));
    }

    // the cycle goes from the frame at `place` up to the top and back: its last connection closes it
    void addCloser(Slot& dependent, bool connected, std::size_t place) {
        const std::size_t last = stack_.back().connected;
        if (connected)
            closers.push_back(dependent.shared_from_this());
        else if (last != none && last > place)
            closers.push_back(stack_[last].slot->shared_from_this());
    }

    std::unordered_map<const Slot*, std::size_t> places_; // in the stack, or done
    std::vector<Frame> stack_;
};

} // namespace

std::vector<std::shared_ptr<Slot>> Graph::cycleClosers() const {
    CycleSearch search;
    const auto visit = [&](auto&& self, Slot& slot) -> void {
        if (slot.source())
            search.from(slot);
        slot.forEachPart([&](Slot& part) { self(self, part); });
    };
    for (const auto& [order, node] : byOrder_)
        for (const std::shared_ptr<Slot>& slot : node->data()->slots)
            visit(visit, *slot);
    return search.closers;
}

// --- values ---

std::string Graph::setRefusal(const Slot& slot) {
    if (!slot.field.attribute->writable)
        return "'" + slot.name() + "' is an output and cannot be set";
    for (const Slot* at = &slot; at; at = at->parent) {
        if (at->locked)
            return "'" + slot.name() + "' is locked";
        if (const Slot* source = at->source())
            return "'" + slot.name() + "' is connected from '" + source->name() + "' and cannot be set";
    }
    return {};
}

void Graph::valueSet(Slot& slot) {
    slot.markClean();
    propagateFrom(slot);
    notify(slot, HNodeMessage::kAttributeSet);
}

void Graph::setLocked(Slot& slot, bool locked) {
    slot.locked = locked;
    notify(slot, locked ? HNodeMessage::kAttributeLocked : HNodeMessage::kAttributeUnlocked);
}

void Graph::removeElement(Slot& array, unsigned index) {
    const std::shared_ptr<Slot> element = array.elements().find(index);
    if (!element)
        throw std::invalid_argument("'" + array.name() + "' has no element " + std::to_string(index));
    const std::shared_ptr<Slot> kept = array.shared_from_this();
    disconnectAll(*element);
    if (array.elements().find(index) != element)
        return; // it went with its connection
    array.ownElements().remove(index);
    propagateFrom(array);
    notify(*element, HNodeMessage::kAttributeArrayRemoved);
    element->detach();
}

void Graph::notify(Slot& slot, int mask, const Slot* other) {
    if (!slot.owner || slot.owner->node.callbacks.empty())
        return;
    const std::shared_ptr<Node> node = std::static_pointer_cast<Node>(slot.owner->node.shared_from_this());
    const std::vector<Node::Callback> callbacks = node->callbacks; // one may remove another
    for (const Node::Callback& callback : callbacks) {
        if (callbackNodes_.count(callback.id) == 0)
            continue;
        HPlug plug = makePlug(slot);
        HPlug otherPlug = other ? makePlug(*other) : HPlug();
        callPlugin(*node, "attribute-changed callback", [&]() -> HStatus {
            callback.function(mask, plug, otherPlug, callback.clientData);
            return HStatus::kSuccess;
        });
    }
}

// --- callbacks ---

HCallbackId Graph::addCallback(Node& node, HNodeMessage::HAttributeChangedFunction function, void* clientData) {
    const HCallbackId id = nextCallback++;
    node.callbacks.push_back({id, function, clientData});
    callbackNodes_[id] = std::static_pointer_cast<Node>(node.shared_from_this());
    return id;
}

bool Graph::removeCallback(HCallbackId id) {
    const auto found = callbackNodes_.find(id);
    if (found == callbackNodes_.end())
        return false;
    if (const std::shared_ptr<Node> node = found->second.lock())
        node->callbacks.erase(std::remove_if(node->callbacks.begin(), node->callbacks.end(),
                                             [&](const Node::Callback& callback) { return callback.id == id; }),
                              node->callbacks.end());
    callbackNodes_.erase(found);
    return true;
}

// --- time ---

void Graph::setTime(double time) {
    time_ = time;
    setTimeIn(*timeNode_->data(), time);
    propagateFrom(*timeNode_->data()->slots[timeOutPosition()]);
}

void Graph::setTimeIn(NodeData& data, double time) const {
    if (&data.node != timeNode_.get() && timeNode_)
        return;
    if (&data.node.type() == timeClass().get()) {
        Slot& slot = *data.slots[timeOutPosition()];
        slot.number = time;
        slot.markClean();
    }
}

// --- what can be observed ---

void Graph::recordDirty(const Slot& slot) {
    if (dirtyPlugs_)
        dirtyPlugs_->push_back(slot.name());
}

void Graph::observeComputes(std::vector<std::string>* plugs) {
    computedPlugs_ = plugs;
}

void Graph::recordCompute(const Slot& slot) {
    if (!computedPlugs_.load(std::memory_order_relaxed))
        return;
    const std::scoped_lock lock(computesMutex_);
    if (std::vector<std::string>* plugs = computedPlugs_)
        plugs->push_back(slot.name());
}

} // namespace OpenQuarn
