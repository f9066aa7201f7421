// SPDX-License-Identifier: Apache-2.0
#include "frame/Prediction.h"

#include <oneapi/tbb/global_control.h>

namespace neuralWarp {

Prediction::Where Prediction::bestFor(std::size_t vertexCount) {
    // below, a frame takes a few times as long as it takes to wake a worker, who is of more use to another mesh
    constexpr std::size_t fewestVertices = 256;
    const bool mayAWorkerCome = tbb::this_task_arena::max_concurrency() > 1 &&
                                tbb::global_control::active_value(tbb::global_control::max_allowed_parallelism) > 1;
    return mayAWorkerCome && vertexCount >= fewestVertices ? Where::beside : Where::inLine;
}

// a group of its own, which the failure of another evaluation does not cancel, with this thread's rounding
Prediction::Prediction(Network& network, std::span<const float> controls, FrameObserver& observer, Where where)
    : network_(network)
    , controls_(controls)
    , observer_(observer)
    , context_(tbb::task_group_context::isolated,
               tbb::task_group_context::default_traits | tbb::task_group_context::fp_settings)
    , group_(context_) {
    if (where == Where::beside) {
        group_.run([this] { outputs_ = network_.run(controls_); });
        isPending_ = true;
        return;
    }
    const ObservedStep step(observer_, FrameStep::network);
    outputs_ = network_.run(controls_);
    observer_.takeOutputs(outputs_);
}

Prediction::~Prediction() {
    if (!isPending_)
        return;
    group_.cancel();
    try {
        group_.wait();
    } catch (...) { // nobody asks for it any more
    }
}

std::vector<float>& Prediction::outputs() {
    if (!isPending_)
        return outputs_;
    const ObservedStep step(observer_, FrameStep::network);
    isPending_ = false;
    group_.wait();
    observer_.takeOutputs(outputs_);
    return outputs_;
}

} // namespace neuralWarp
