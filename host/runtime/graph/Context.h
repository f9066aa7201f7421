// SPDX-License-Identifier: Apache-2.0
// Evaluation contexts: the normal one, which is the scene's own data, and others with data of their own.
#pragma once

#include "graph/Node.h"

#include <memory>
#include <unordered_map>

namespace OpenQuarn {

/// Data for evaluating at another time. Each node's values are copied when the evaluation first comes to it; inputs
/// keep the scene's values, everything that is computed or connected is evaluated anew, and plug-in data starts as on a
/// new node. Connections are always the scene's. Thread: one at a time, and not while the scene is changed or
/// evaluated.
class Context {
public:
    explicit Context(double time)
        : time_(time) {}
    ~Context();
    Context(const Context&) = delete;
    Context& operator=(const Context&) = delete;

    double time() const { return time_; }
    /// Evaluates everything anew from now on; plug-in data stays.
    void setTime(double time);
    std::shared_ptr<NodeData> dataOf(Node& node);

private:
    void fill(NodeData& data);

    struct Entry {
        std::shared_ptr<Node> node; // kept: the data refers to it
        std::shared_ptr<NodeData> data;
    };

    double time_;
    std::unordered_map<const Node*, Entry> data_;
};

/// The context that the thread computes in: what a plug-in's call inside of compute() finds. For the bodies of the API
/// alone; the runtime itself says in which context it means a thing.
Context* currentContext();

/// Holds while the plug-in's compute() runs.
class ContextScope {
public:
    explicit ContextScope(Context* context);
    ~ContextScope();
    ContextScope(const ContextScope&) = delete;
    ContextScope& operator=(const ContextScope&) = delete;

private:
    Context* previous_;
};

/// The API's handle on a context; null: the normal one.
HDGContext contextHandle(const Context* context);

/// The data of a node in a context.
std::shared_ptr<NodeData> dataIn(Context* context, Node& node);

/// The slot at the same place in another context's data of the node; null when it is not there. `create` makes elements
/// that are missing.
std::shared_ptr<Slot> slotIn(const NodeData& data, const Slot& slot, bool create);

/// What a slot is connected to, in the slot's own context; null when it is not connected.
std::shared_ptr<Slot> sourceInContext(const Slot& slot);

} // namespace OpenQuarn
