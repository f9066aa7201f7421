// SPDX-License-Identifier: Apache-2.0
#include "openquarn_app/Evaluation.h"

#include "core/apiCall.h"
#include "core/threads.h"
#include "graph/Context.h"
#include "graph/Graph.h"
#include "graph/arrayLock.h"
#include "graph/dirty.h"
#include "graph/evaluation.h"
#include "graph/plugImpl.h"

#include <oneapi/tbb/parallel_for.h>

namespace OpenQuarn {
namespace {

HStatus nullPlug() {
    return {HStatus::kInvalidParameter, "the plug is null"};
}

HStatus pullPlug(Context* context, const HPlug& plug) noexcept {
    try {
        const std::shared_ptr<Slot> slot = slotToEvaluate(context, plug);
        if (slot)
            return pull(slot);
        return plug.isNull() ? nullPlug()
                             : HStatus(HStatus::kFailure, "'" + plug.name().asStdString() + "' does not exist");
    } catch (...) {
        return statusOfException("evaluate");
    }
}

} // namespace

HStatus evaluate(const HPlug& plug) {
    const HStatus refused = threadStatus({"evaluate", ThreadTag::main});
    return refused.error() ? refused : pullPlug(normalContext, plug);
}

HStatus evaluate(const HPlugArray& plugs, bool parallel) {
    if (HStatus refused = threadStatus({"evaluate", ThreadTag::main}); refused.error())
        return refused;
    std::vector<HStatus> statuses(plugs.size());
    if (parallel) {
        for (const HPlug& plug : plugs)
            slotToEvaluate(normalContext, plug);
        const ParallelSection section;
        const WorkScope waiting(ThreadWork::waiting);
        tbb::parallel_for(std::size_t{0}, plugs.size(),
                          [&](std::size_t i) { statuses[i] = pullPlug(normalContext, plugs[i]); });
    } else {
        for (std::size_t i = 0; i < plugs.size(); ++i)
            statuses[i] = pullPlug(normalContext, plugs[i]);
    }
    for (const HStatus& status : statuses)
        if (status.error())
            return status;
    return HStatus::kSuccess;
}

HStatus makeDirty(const HPlug& plug) {
    if (HStatus refused = threadStatus({"makeDirty", ThreadTag::main}); refused.error())
        return refused;
    const std::shared_ptr<Slot> slot = resolvePlug(normalContext, plug);
    if (!slot)
        return plug.isNull() ? nullPlug()
                             : HStatus(HStatus::kFailure, "'" + plug.name().asStdString() + "' does not exist");
    makeDirty(*slot, true);
    return HStatus::kSuccess;
}

HStatus makeDirty(const HObject& node) {
    if (HStatus refused = threadStatus({"makeDirty", ThreadTag::main}); refused.error())
        return refused;
    const auto found = Access::as<Node>(node);
    if (!found)
        return {HStatus::kInvalidParameter, "the object is no node"};
    for (const std::shared_ptr<Slot>& slot : found->data()->slots)
        if (slot->field.computed)
            makeDirty(*slot, true);
    return HStatus::kSuccess;
}

unsigned computeCount(const HObject& node) {
    const auto found = Access::as<Node>(node);
    return found ? found->computes.load() : 0U;
}

DirtyWatch::DirtyWatch() {
    currentGraph().observeDirty(&plugs_);
}
DirtyWatch::~DirtyWatch() {
    if (Graph* graph = Graph::current())
        graph->observeDirty(nullptr);
}

ComputeWatch::ComputeWatch() {
    currentGraph().observeComputes(&plugs_);
}
ComputeWatch::~ComputeWatch() {
    if (Graph* graph = Graph::current())
        graph->observeComputes(nullptr);
}

struct EvaluationContext::Impl {
    Context context;
};

EvaluationContext::EvaluationContext(double frame)
    : impl_(new Impl{Context(frame)}) {}
EvaluationContext::~EvaluationContext() = default;

void EvaluationContext::setTime(double frame) {
    impl_->context.setTime(frame);
}

HDataHandle EvaluationContext::evaluateAt(const HPlug& plug, HStatus* status) {
    HStatus outcome = threadStatus({"EvaluationContext::evaluateAt", ThreadTag::main});
    std::shared_ptr<Slot> slot;
    if (!outcome.error()) {
        outcome = pullPlug(&impl_->context, plug);
        slot = resolvePlug(&impl_->context, plug);
    }
    if (status)
        *status = outcome;
    return slot ? Access::make<HDataHandle>(std::move(slot)) : HDataHandle();
}

} // namespace OpenQuarn
