// SPDX-License-Identifier: Apache-2.0
// A frame in the host's profile.
#pragma once

#include "deformer/neuralWarpUtils.h"
#include "frame/FrameObserver.h"
#include "openquarn/HProfilingScope.h"
#include "openquarn/HString.h"

#include <optional>
#include <utility>

namespace neuralWarp {

/// Opens a scope of the category "Evaluation" while the network runs, and, in Surface mode, while the deltas are
/// carried by frames; everything is passed on to another observer.
class ProfiledFrame final : public FrameObserver {
public:
    /// `next`         outlives this.
    /// `networkEvent` the name of the scope of the network; outlives this.
    /// `description`  that of both scopes.
    ProfiledFrame(FrameObserver& next, const char* networkEvent, HString description, bool isSurface)
        : next_(next)
        , networkEvent_(networkEvent)
        , description_(std::move(description))
        , isSurface_(isSurface) {}

    void beginStep(FrameStep step) override {
        next_.beginStep(step);
        if (step == FrameStep::network)
            scope_.emplace(evaluationCategory(), 0, networkEvent_, description_);
        else if (step == FrameStep::apply && isSurface_)
            scope_.emplace(evaluationCategory(), 10, "CalculateVertexFrames", description_);
    }
    void endStep(FrameStep step) override {
        scope_.reset();
        next_.endStep(step);
    }
    void takeOutputs(const std::vector<float>& outputs) override { next_.takeOutputs(outputs); }

private:
    FrameObserver& next_;
    const char* networkEvent_;
    HString description_;
    bool isSurface_;
    std::optional<HProfilingScope> scope_;
};

} // namespace neuralWarp
