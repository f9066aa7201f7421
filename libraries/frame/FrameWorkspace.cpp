// SPDX-License-Identifier: Apache-2.0
#include "frame/FrameWorkspace.h"

#include <algorithm>

namespace neuralWarp {

const quill::Smoother& FrameWorkspace::smoother(const FrameModel& model) {
    if (!isSmootherDue_)
        return smoother_;
    smoother_ = {};
    const RestSurface& rest = model.rest;
    if (rest.connections.vertexCount() <= model.vertexCount &&
        rest.connections.connections().size() <= rest.connectionWeights.size())
        smoother_.build(rest.connections, rest.connectionWeights, model.vertexCount);
    isSmootherDue_ = false;
    return smoother_;
}

const quill::SurfaceTransport& FrameWorkspace::transport(const FrameModel& model) {
    if (!isTransportDue_)
        return transport_;
    transport_ = {};
    const RestSurface& rest = model.rest;
    if (rest.frames.vertexCount() <= model.vertexCount)
        transport_.build(rest.frames, rest.points, rest.smoothedFramesInverse, model.vertexCount,
                         model.driven.vertices);
    isTransportDue_ = false;
    return transport_;
}

const std::vector<std::uint32_t>& FrameWorkspace::drivenBlocks(const FrameModel& model) {
    if (!areBlocksDue_)
        return drivenBlocks_;
    drivenBlocks_.clear();
    for (std::size_t k = 0; k < model.driven.count; ++k)
        drivenBlocks_.push_back(static_cast<std::uint32_t>(model.driven.slot(k) / PrincipalBasis::lanes));
    std::sort(drivenBlocks_.begin(), drivenBlocks_.end());
    drivenBlocks_.erase(std::unique(drivenBlocks_.begin(), drivenBlocks_.end()), drivenBlocks_.end());
    areBlocksDue_ = false;
    return drivenBlocks_;
}

std::size_t FrameWorkspace::bytes() const {
    return smoother_.bytes() + transport_.bytes() + drivenBlocks_.capacity() * sizeof(drivenBlocks_[0]) +
           FrameArrays::bytes();
}

} // namespace neuralWarp
