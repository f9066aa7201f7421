// SPDX-License-Identifier: Apache-2.0
// Who watches a frame: a profiler, a benchmark, a test.
#pragma once

#include <cstddef>
#include <vector>

namespace neuralWarp {

/// Steps of a frame in which a model is applied, in their order. Those of the library are network, points, deltas,
/// apply; the others are those of a host around it. Where the network runs beside the points (frame/Prediction.h), its
/// step comes after theirs, and is the rest of it that the frame waits for.
enum class FrameStep : std::size_t { prepare, gather, network, points, deltas, apply, fetch, blend };
inline constexpr std::size_t frameStepCount = 8;

/// Hears of one frame after another, on the thread that computes it. Each call does nothing unless it is overridden.
class FrameObserver {
public:
    virtual ~FrameObserver() = default;

    /// The one that sees nothing. Lives as long as the process, or the module. [any]
    static FrameObserver& none();

    virtual void beginFrame() {}
    /// Steps follow each other and do not nest. One that fails ends too, and so may the frame. Must not throw.
    virtual void beginStep(FrameStep) {}
    virtual void endStep(FrameStep) {}
    /// The raw outputs of the network, within its step; empty when it failed. Not called when it did not run.
    virtual void takeOutputs(const std::vector<float>&) {}
};

/// A step of a frame, from construction to destruction.
class ObservedStep {
public:
    ObservedStep(FrameObserver& observer, FrameStep step)
        : observer_(observer)
        , step_(step) {
        observer_.beginStep(step_);
    }
    ~ObservedStep() { observer_.endStep(step_); }
    ObservedStep(const ObservedStep&) = delete;
    ObservedStep& operator=(const ObservedStep&) = delete;

private:
    FrameObserver& observer_;
    FrameStep step_;
};

} // namespace neuralWarp
