// SPDX-License-Identifier: Apache-2.0
#include "frame/FrameSampler.h"

#include "frame/deltas.h"
#include "quill/parallelFor.h"

#include <algorithm>

namespace neuralWarp {
namespace {

void extractDeltas(Points& deltas, const FrameModel& model, const std::vector<float>& outputs) {
    if (model.shapes.isUsed())
        extractPrincipalDeltas(deltas, outputs, static_cast<std::size_t>(model.shapes.shapeCount), model.shapes.values,
                               model.driven);
    else
        extractComputedDeltas(deltas, outputs, model.driven);
}

void addOffsets(Points& result, const Points& points, const Points& deltas, const DrivenVertices& driven) {
    quill::parallelFor(driven.count, [&](std::size_t k) {
        const std::size_t v = driven.vertex(k);
        result[v] = points[v] + deltas[k];
    });
}

} // namespace

std::vector<float> FrameSampler::predict(Network& network, std::span<const float> controls) const {
    const ObservedStep step(observer_, FrameStep::network);
    std::vector<float> outputs = network.run(controls);
    observer_.takeOutputs(outputs);
    return outputs;
}

FrameCheck FrameSampler::check(std::size_t outputCount) const {
    const FrameCheck outputs = checkOutputs(model_, outputCount);
    if (outputs.fault != FrameFault::none || !model_.settings.isSurface())
        return outputs;
    const std::size_t rest = std::min(model_.rest.points.size(), model_.rest.smoothedFramesInverse.size());
    return {rest < model_.vertexCount ? FrameFault::tooFewRestPoints : FrameFault::none, rest, model_.vertexCount};
}

FrameCheck FrameSampler::place(Points& result, Points& points, const std::vector<float>& outputs,
                               const IsCancelled& isCancelled) const {
    if (points.size() != model_.vertexCount)
        return {FrameFault::otherPointCount, points.size(), model_.vertexCount};
    {
        const ObservedStep step(observer_, FrameStep::points);
        smoothPoints(points, model_.rest, model_.settings.smoothingIterations, isCancelled);
    }
    if (const FrameCheck checked = check(outputs.size()); checked.fault != FrameFault::none)
        return checked;
    Points deltas;
    {
        const ObservedStep step(observer_, FrameStep::deltas);
        result.assign(model_.vertexCount, {});
        extractDeltas(deltas, model_, outputs);
    }
    const ObservedStep step(observer_, FrameStep::apply);
    if (model_.settings.deltaMode == kOffsetMode)
        addOffsets(result, points, deltas, model_.driven);
    else if (model_.settings.isSurface())
        model_.rest.frames.transportDeltas(result, deltas, model_.rest.points, model_.rest.smoothedFramesInverse,
                                           points, model_.driven.vertices);
    return {};
}

} // namespace neuralWarp
