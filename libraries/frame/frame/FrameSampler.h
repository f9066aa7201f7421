// SPDX-License-Identifier: Apache-2.0
// One frame: from what a network gives to the positions that the model gives its vertices. Blending towards them is a
// step of its own (frame/blend.h).
#pragma once

#include "frame/FrameCheck.h"
#include "frame/FrameModel.h"
#include "frame/FrameObserver.h"
#include "frame/FrameWorkspace.h"
#include "frame/Prediction.h"
#include "frame/smoothing.h"

#include <vector>

namespace neuralWarp {

/// Computes frames of a geometry. Costs nothing to make: what stays from frame to frame is in a FrameWorkspace. Loops
/// run on oneTBB's workers and give the same bits on any number of threads.
///
/// Thread: one at a time for one object and what it views. All throw what `observer` and the network throw, and
/// std::bad_alloc.
class FrameSampler {
public:
    /// The observer, and what the model views, outlive this.
    explicit FrameSampler(const FrameModel& model, FrameObserver& observer = FrameObserver::none())
        : model_(model)
        , observer_(observer) {}

    /// Where the model puts the vertices that it drives, in object space:
    ///   Offset    smoothed point + delta
    ///   Surface   rest point + delta, carried from the frame of the smoothed rest shape to that of the smoothed points
    /// and nowhere, for another mode.
    ///   workspace    of this geometry; invalidated when something that the model views has changed
    ///   result       out, resized to model.vertexCount; zero where no slot drives a vertex. As it was after a fault.
    ///   May
    ///                be workspace.result
    ///   points       the points that come in [model.vertexCount]. May be workspace.points
    ///   outputs      of the network: deltas [slots][3], or coefficients of the principal shapes [shapes]; any number
    ///   isCancelled  asked in long smoothing, which then throws quill::Cancelled
    FrameCheck place(FrameWorkspace& workspace, Points& result, const Points& points, const std::vector<float>& outputs,
                     const IsCancelled& isCancelled = {}) const;
    /// The same; the points are smoothed while a prediction is under way.
    FrameCheck place(FrameWorkspace& workspace, Points& result, const Points& points, Prediction& prediction,
                     const IsCancelled& isCancelled = {}) const;

private:
    void smooth(FrameWorkspace& workspace, const Points& points, const IsCancelled& isCancelled) const;
    FrameCheck move(FrameWorkspace& workspace, Points& result, const Points& points,
                    const std::vector<float>& outputs) const;
    FrameCheck check(std::size_t outputCount) const;

    FrameModel model_;
    FrameObserver& observer_;
};

} // namespace neuralWarp
