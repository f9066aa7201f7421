// SPDX-License-Identifier: Apache-2.0
// What a network gives for a frame, which may still be on its way.
#pragma once

#include "frame/FrameObserver.h"
#include "frame/Network.h"

#include <oneapi/tbb/task_arena.h>
#include <oneapi/tbb/task_group.h>

#include <cstddef>
#include <span>
#include <utility>
#include <vector>

namespace neuralWarp {

/// One run of a network: in line, or on one of oneTBB's workers beside what the frame does without it (decision 0185).
/// Its outputs are the same. The observer hears of it on the thread that made this, to which everything here belongs.
class Prediction {
public:
    enum class Where { inLine, beside };
    /// Where the run of a frame pays: beside, when there are `vertexCount` vertices to be smoothed meanwhile and a
    /// worker may come. [any]
    static Where bestFor(std::size_t vertexCount);

    /// Runs the network within the step FrameStep::network, or has it run.
    ///   network   used by nobody else until the outputs are there, or this is gone
    ///   controls  as Network::run() takes them
    ///   observer  is shown the outputs
    /// All three outlive this. Throws what observer and network throw, and std::bad_alloc.
    Prediction(Network& network, std::span<const float> controls, FrameObserver& observer, Where where);
    /// Leaves out a run that has not begun, and waits for one that has; what it threw is lost.
    ~Prediction();
    Prediction(const Prediction&) = delete;
    Prediction& operator=(const Prediction&) = delete;

    /// Calls body(), whose loops do not take up the run on this thread while they wait for others.
    template <class Body>
    void meanwhile(const Body& body) const {
        if (isPending_)
            tbb::this_task_arena::isolate(body);
        else
            body();
    }

    /// What Network::run() gave. A run beside is waited for, within the step FrameStep::network, and made here when no
    /// worker has begun it. Throws what observer and network throw, the latter once.
    std::vector<float>& outputs();

private:
    Network& network_;
    std::span<const float> controls_;
    FrameObserver& observer_;
    std::vector<float> outputs_;
    bool isPending_ = false;
    tbb::task_group_context context_;
    tbb::task_group group_;
};

} // namespace neuralWarp
