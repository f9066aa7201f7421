// SPDX-License-Identifier: Apache-2.0
// Evaluating plugs, and watching what that does.
#pragma once

#include "openquarn/HApi.h"
#include "openquarn/HDataBlock.h"
#include "openquarn/HPlug.h"

#include <memory>
#include <string>
#include <vector>

namespace OpenQuarn {

/// Brings the plug up to date. Answers with the status of its own compute(); failures further up are messages of
/// severity "report". Thread: main.
OPENQUARN_API HStatus evaluate(const HPlug& plug);

/// Brings all plugs up to date, on several threads when `parallel` says so and oneTBB has more than one. The result
/// does not depend on it. Answers with the first failing status in the order of the plugs; all are evaluated in any
/// case. Thread: main.
OPENQUARN_API HStatus evaluate(const HPlugArray& plugs, bool parallel);

/// Makes the plug, and what depends on it, dirty, even where it is dirty already; of a node, all of its outputs.
/// Thread: main.
OPENQUARN_API HStatus makeDirty(const HPlug& plug);
OPENQUARN_API HStatus makeDirty(const HObject& node);

/// How often compute() of the node has been called since it was created. 0 for a null node.
OPENQUARN_API unsigned computeCount(const HObject& node);

/// Watches the scene: names of plugs, in the order in which they became dirty, or were computed, since it was made or
/// cleared. One of a kind at a time; a new one replaces the old. Thread: main.
class OPENQUARN_API DirtyWatch {
public:
    DirtyWatch();
    ~DirtyWatch();
    DirtyWatch(const DirtyWatch&) = delete;
    DirtyWatch& operator=(const DirtyWatch&) = delete;
    const std::vector<std::string>& plugs() const { return plugs_; }
    void clear() { plugs_.clear(); }

private:
    std::vector<std::string> plugs_;
};

class OPENQUARN_API ComputeWatch {
public:
    ComputeWatch();
    ~ComputeWatch();
    ComputeWatch(const ComputeWatch&) = delete;
    ComputeWatch& operator=(const ComputeWatch&) = delete;
    const std::vector<std::string>& plugs() const { return plugs_; }
    void clear() { plugs_.clear(); }

private:
    std::vector<std::string> plugs_;
};

/// The scene at another time, on data of its own: what is evaluated in it is not seen in the scene, and the scene's
/// state is not touched. HDGContext::current() is not normal meanwhile. Inputs have the scene's values of when the
/// context first came to their node; plug-in data starts as on a new node, and stays from one time to the next.
/// Changing the scene while a context lives is not supported: make a new one. Thread: main.
class OPENQUARN_API EvaluationContext {
public:
    /// `frame` the time it evaluates at.
    explicit EvaluationContext(double frame);
    ~EvaluationContext();
    EvaluationContext(const EvaluationContext&) = delete;
    EvaluationContext& operator=(const EvaluationContext&) = delete;

    void setTime(double frame);
    /// The evaluated value of a plug in this context; valid while the context lives. Invalid on failure.
    HDataHandle evaluateAt(const HPlug& plug, HStatus* status = nullptr);

private:
    struct Impl;
    std::unique_ptr<Impl> impl_;
};

} // namespace OpenQuarn
