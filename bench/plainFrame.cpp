// SPDX-License-Identifier: Apache-2.0
#include "plainFrame.h"

#include "plainLoops.h"

#include <oneapi/tbb/parallel_for.h>

namespace plain {
namespace {

template <typename Body>
void loop(std::size_t count, const Body& body) {
    tbb::parallel_for(tbb::blocked_range<std::size_t>(0, count), [&](const tbb::blocked_range<std::size_t>& range) {
        for (std::size_t i = range.begin(); i != range.end(); ++i)
            body(i);
    });
}

} // namespace

Frame::Frame(neuralWarp::neuralWarpData& state, const HPointArray& input, bool isSurface, unsigned smoothing)
    : state_(state)
    , input_(input.begin(), input.end())
    , basis_(state.principalShapes.slotMajor())
    , shapes_(state.principalShapes.shapeCount())
    , isSurface_(isSurface)
    , smoothing_(smoothing) {}

Frame::Points Frame::deltasOf(const std::vector<float>& outputs) const {
    Points deltas(input_.size());
    loop(deltas.size(), [&](std::size_t i) {
        if (shapes_ == 0) {
            deltas[i] = {outputs[3 * i], outputs[3 * i + 1], outputs[3 * i + 2]};
            return;
        }
        const float* shape = basis_.data() + 3 * shapes_ * i;
        float x = 0.0F, y = 0.0F, z = 0.0F;
        for (std::size_t j = 0; j < shapes_; ++j) {
            x += outputs[j] * shape[3 * j];
            y += outputs[j] * shape[3 * j + 1];
            z += outputs[j] * shape[3 * j + 2];
        }
        deltas[i] = {x, y, z};
    });
    return deltas;
}

Frame::Points Frame::placed(const Points& smoothed, const Points& deltas) const {
    Points result(smoothed.size());
    if (!isSurface_) {
        loop(result.size(), [&](std::size_t i) { result[i] = smoothed[i] + deltas[i]; });
        return result;
    }
    std::vector<quill::mat4d> current(smoothed.size());
    frames(current, smoothed, state_.vertexFrames.framesIndexer(), state_.vertexFrames.framesPairs(), false);
    loop(result.size(), [&](std::size_t i) {
        result[i] = transportDelta(state_.restPoints[i], deltas[i], state_.restFramesInverse[i], current[i]);
    });
    return result;
}

void Frame::run(const std::vector<float>& controls) {
    const std::vector<float> outputs = state_.session.run(controls);
    Points points(input_.size()), other(input_.size());
    loop(points.size(), [&](std::size_t i) {
        points[i] = {static_cast<float>(input_[i].x), static_cast<float>(input_[i].y), static_cast<float>(input_[i].z)};
    });
    for (unsigned pass = 0; pass < smoothing_; ++pass) {
        smoothingPass(points, other, state_.vertexConnections.connectionsIndexer(),
                      state_.vertexConnections.connections(), state_.connectionWeights);
        points.swap(other);
    }
    const Points result = placed(points, deltasOf(outputs));
    std::vector<HPoint> out(input_.size());
    loop(out.size(), [&](std::size_t i) {
        const HPoint& p = input_[i];
        out[i] = {p.x + (static_cast<double>(result[i].x) - p.x), p.y + (static_cast<double>(result[i].y) - p.y),
                  p.z + (static_cast<double>(result[i].z) - p.z)};
    });
    output_.swap(out);
}

} // namespace plain
