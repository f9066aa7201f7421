// SPDX-License-Identifier: Apache-2.0
#include "graph/evaluation.h"

#include "core/threads.h"
#include "graph/Context.h"
#include "graph/EvaluationLock.h"
#include "graph/Graph.h"
#include "graph/plugImpl.h"
#include "openquarn_app/Messages.h"

#include <oneapi/tbb/task_arena.h>

#include <algorithm>
#include <mutex>
#include <unordered_set>

namespace OpenQuarn {
namespace {

// how deep pull() may call itself before what lies further up is evaluated from the top down instead
constexpr int deepest = 100;

thread_local int depth = 0;
thread_local std::vector<const Slot*> computing; // on this thread, outermost first

EvaluationLock::Part partOf(const Slot& slot) {
    if (slot.owner->node.kind() == HFn::kGeometryFilter)
        for (const Slot* at = &slot; at; at = at->parent)
            if (at->isElement && !at->parent->parent)
                return {slot.owner, at->index};
    return {slot.owner, -1};
}

struct DepthCount {
    DepthCount() { ++depth; }
    ~DepthCount() { --depth; }
    DepthCount(const DepthCount&) = delete;
    DepthCount& operator=(const DepthCount&) = delete;
};

HStatus pullLocked(const std::shared_ptr<Slot>& slot);

HStatus failedStatus(const Slot& slot) {
    return {HStatus::kFailure, "the last compute of '" + slot.name() + "' failed"};
}

HStatus statusOf(const Slot& slot) {
    return slot.hasFailed() ? failedStatus(slot) : HStatus();
}

HStatus runCompute(Node& node, NodeData& data, const Slot& slot) {
    HPxNode* user = node.userNode();
    if (!user)
        return HStatus::kUnknownParameter;
    ++node.computes;
    node.graph().recordCompute(slot);
    const ContextScope context(data.context);
    HPlug plug = makePlug(slot);
    auto block = Access::make<HDataBlock>(data.shared_from_this());
    HStatus status;
    // a parallel loop of the plug-in must not pick up the evaluation of another geometry while it waits
    tbb::this_task_arena::isolate(
        [&] { status = callPlugin(node, "compute", [&] { return user->compute(plug, block); }); });
    return status;
}

HStatus compute(const std::shared_ptr<Slot>& slot) {
    if (std::find(computing.begin(), computing.end(), slot.get()) != computing.end()) {
        const std::string text = "'" + slot->name() + "' depends on itself: its last value is used";
        showMessage(Severity::error, text);
        return {HStatus::kFailure, text};
    }
    if (!slot->owner) // removed while this thread waited for the graph: there is nothing left to compute
        return HStatus::kSuccess;
    const ComputeClaim claim(*slot);
    if (!slot->owner) // or while it waited for who computes the node
        return HStatus::kSuccess;
    if (!slot->mayBeDirty()) // another thread was faster
        return statusOf(*slot);
    const std::shared_ptr<Node> node = std::static_pointer_cast<Node>(slot->owner->node.shared_from_this());
    HStatus status = runCompute(*node, *slot->owner, *slot);
    if (status == HStatus::kUnknownParameter)
        status = HStatus::kSuccess; // nobody produces it: it is what was set
    if (status.error())
        showMessage(Severity::report,
                    "'" + slot->name() + "' could not be computed: " + status.errorString().asStdString());
    slot->markClean();
    slot->setFailed(status.error());
    return status;
}

void takeFromSource(Slot& slot, const std::shared_ptr<Slot>& source) {
    pullLocked(source);
    if (!slot.mayBeDirty()) // another thread was faster, and readers may be at it already
        return;
    if (source->owner) // an element that has been removed gives no value: the last one stays
        slot.copyFrom(*source);
    slot.markClean();
}

// the nearest slot above that is connected as a whole
std::shared_ptr<Slot> connectedAbove(const Slot& slot) {
    for (Slot* above = slot.parent; above; above = above->parent)
        if (sourceInContext(*above))
            return above->shared_from_this();
    return nullptr;
}

void pullParts(Slot& slot) {
    std::vector<std::shared_ptr<Slot>> parts; // evaluating one may add or remove others
    parts.reserve(slot.children().size() + slot.elements().size());
    slot.forEachPart([&](Slot& part) {
        if (part.mayBeDirty())
            parts.push_back(part.shared_from_this());
    });
    for (const std::shared_ptr<Slot>& part : parts)
        pullLocked(part);
}

// What has to be clean before the slot can be computed without going deep: the connected inputs of its node that it
// depends on, and outputs of the node that feed it.
void addUpstream(const Slot& slot, std::vector<std::shared_ptr<Slot>>& upstream) {
    const auto add = [&](auto&& self, Slot& part) -> void {
        if (!part.mayBeDirty())
            return;
        if (const std::shared_ptr<Slot> source = sourceInContext(part))
            upstream.push_back(source);
        part.forEachPart([&](Slot& deeper) { self(self, deeper); });
    };
    if (!slot.field.computed) {
        const_cast<Slot&>(slot).forEachPart([&](Slot& part) { add(add, part); });
        return;
    }
    for (const Field::Dependency& affecting : slot.field.affectedBy)
        if (const std::shared_ptr<Slot> input = slot.owner ? slot.owner->slot(*affecting.field) : nullptr)
            add(add, *input);
}

// From the top down, with a stack of its own: afterwards everything that the slot may ask for is clean.
void evaluateUpstream(const std::shared_ptr<Slot>& slot) {
    struct Entry {
        std::shared_ptr<Slot> slot;
        bool expanded = false;
    };
    std::vector<Entry> stack{{slot}};
    std::unordered_set<const Slot*> seen;
    while (!stack.empty()) {
        const std::shared_ptr<Slot> top = stack.back().slot;
        if (!top->mayBeDirty() || stack.back().expanded || !seen.insert(top.get()).second) {
            const bool last = stack.size() == 1; // the slot itself is its caller's
            stack.pop_back();
            if (!last)
                pullLocked(top);
            continue;
        }
        stack.back().expanded = true;
        std::vector<std::shared_ptr<Slot>> upstream;
        if (const std::shared_ptr<Slot> source = sourceInContext(*top))
            upstream.push_back(source);
        addUpstream(*top, upstream);
        for (const std::shared_ptr<Slot>& above : upstream)
            stack.push_back({above});
    }
}

HStatus pullLocked(const std::shared_ptr<Slot>& slot) {
    if (!slot->mayBeDirty())
        return statusOf(*slot);
    const DepthCount count;
    if (depth == deepest) {
        depth = 1; // what is evaluated now starts anew, from the top
        evaluateUpstream(slot);
        depth = deepest;
        if (!slot->mayBeDirty())
            return statusOf(*slot);
    }
    if (const std::shared_ptr<Slot> source = sourceInContext(*slot)) {
        takeFromSource(*slot, source);
        return HStatus::kSuccess;
    }
    if (const std::shared_ptr<Slot> above = connectedAbove(*slot))
        return pullLocked(above);
    if (slot->field.computed)
        return compute(slot);
    pullParts(*slot);
    slot->markClean();
    return HStatus::kSuccess;
}

} // namespace

ComputeClaim::ComputeClaim(const Slot& slot)
    : part_(partOf(slot)) {
    EvaluationLock::instance().claim(part_);
    computing.push_back(&slot);
}

ComputeClaim::~ComputeClaim() {
    computing.pop_back();
    EvaluationLock::instance().disclaim(part_);
}

HStatus pull(const std::shared_ptr<Slot>& slot) {
    if (!slot->mayBeDirty())
        return statusOf(*slot);
    const WorkScope evaluating(ThreadWork::evaluation);
    const std::scoped_lock lock(EvaluationLock::instance());
    return pullLocked(slot);
}

OutsideOfGraph::OutsideOfGraph()
    : depth_(EvaluationLock::instance().release()) {}
OutsideOfGraph::~OutsideOfGraph() {
    EvaluationLock::instance().retake(depth_);
}

} // namespace OpenQuarn
