// SPDX-License-Identifier: Apache-2.0
#include "frame/FrameSampler.h"

#include "frame/deltas.h"
#include "quill/parallelFor.h"

#include <algorithm>

namespace neuralWarp {
namespace {

void extractDeltas(FrameWorkspace& workspace, const FrameModel& model, const std::vector<float>& outputs) {
    if (!model.shapes.isUsed()) {
        extractComputedDeltas(workspace.deltas, outputs, model.driven);
        return;
    }
    static const std::vector<std::uint32_t> none;
    extractPrincipalDeltas(workspace.deltas, outputs, model.shapes.values, model.driven,
                           model.driven.slots ? workspace.drivenBlocks(model) : none, workspace.slotDeltas);
}

template <class Surface>
void addOffsets(Points& result, const Surface& points, const Points& deltas, const DrivenVertices& driven) {
    quill::parallelFor(
        driven.count,
        [&](std::size_t k) {
            const std::size_t v = driven.vertex(k);
            result[v] = quill::val3<float>(points[v].x, points[v].y, points[v].z) + deltas[k];
        },
        quill::copyGrain);
}

void pack(quill::PaddedPoints& rows, const Points& points) {
    rows.resize(points.size());
    quill::parallelFor(
        points.size(),
        [&](std::size_t v) {
            rows[v] = {points[v].x, points[v].y, points[v].z};
        },
        quill::copyGrain);
}

} // namespace

/// The points as deltas are meant on them, in workspace.smoothed; not in Offset mode without smoothing.
void FrameSampler::smooth(FrameWorkspace& workspace, const Points& points, const IsCancelled& isCancelled) const {
    const ObservedStep step(observer_, FrameStep::points);
    const DeltaSettings& settings = model_.settings;
    if (settings.isSmoothed())
        if (const quill::Smoother& smoother = workspace.smoother(model_); smoother.vertexCount() == points.size()) {
            smoother.run(points, static_cast<std::size_t>(settings.smoothingIterations), workspace.smoothed,
                         workspace.scratch, {isCancelled});
            return;
        }
    if (settings.isSmoothed() || settings.isSurface())
        pack(workspace.smoothed, points);
}

FrameCheck FrameSampler::check(std::size_t outputCount) const {
    const FrameCheck outputs = checkOutputs(model_, outputCount);
    if (outputs.fault != FrameFault::none || !model_.settings.isSurface())
        return outputs;
    const std::size_t rest = std::min(model_.rest.points.size(), model_.rest.smoothedFramesInverse.size());
    return {rest < model_.vertexCount ? FrameFault::tooFewRestPoints : FrameFault::none, rest, model_.vertexCount};
}

FrameCheck FrameSampler::place(FrameWorkspace& workspace, Points& result, const Points& points,
                               const std::vector<float>& outputs, const IsCancelled& isCancelled) const {
    if (points.size() != model_.vertexCount)
        return {FrameFault::otherPointCount, points.size(), model_.vertexCount};
    smooth(workspace, points, isCancelled);
    return move(workspace, result, points, outputs);
}

FrameCheck FrameSampler::place(FrameWorkspace& workspace, Points& result, const Points& points, Prediction& prediction,
                               const IsCancelled& isCancelled) const {
    if (points.size() != model_.vertexCount)
        return {FrameFault::otherPointCount, points.size(), model_.vertexCount};
    prediction.meanwhile([&] { smooth(workspace, points, isCancelled); });
    return move(workspace, result, points, prediction.outputs());
}

FrameCheck FrameSampler::move(FrameWorkspace& workspace, Points& result, const Points& points,
                              const std::vector<float>& outputs) const {
    if (const FrameCheck checked = check(outputs.size()); checked.fault != FrameFault::none)
        return checked;
    const bool isWhole = !model_.driven.vertices && model_.settings.deltaMode <= kSurfaceMode;
    {
        const ObservedStep step(observer_, FrameStep::deltas);
        result.resize(model_.vertexCount);
        if (!isWhole)
            std::fill(result.begin(), result.end(), quill::val3<float>());
        extractDeltas(workspace, model_, outputs);
    }
    const ObservedStep step(observer_, FrameStep::apply);
    if (model_.settings.isSurface()) {
        const quill::SurfaceTransport& transport = workspace.transport(model_);
        if (transport.size() == model_.driven.count)
            transport.run(result, workspace.deltas, workspace.smoothed);
        else
            std::fill(result.begin(), result.end(), quill::val3<float>());
    } else if (model_.settings.deltaMode == kOffsetMode && model_.settings.isSmoothed())
        addOffsets(result, workspace.smoothed, workspace.deltas, model_.driven);
    else if (model_.settings.deltaMode == kOffsetMode)
        addOffsets(result, points, workspace.deltas, model_.driven);
    return {};
}

} // namespace neuralWarp
