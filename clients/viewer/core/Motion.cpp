// SPDX-License-Identifier: Apache-2.0
#include "Motion.h"

#include "checks.h"

namespace viewer {

Motion::Motion(const Blocks& blocks, const Settings& settings)
    : frameCount_(settings.frames)
    , controls_(heldArrayOf<float>(blocks, "frames.controls", product({settings.frames, settings.controls}))) {
    constexpr std::size_t affine = 12;
    checkFinite("frames.controls", controls_.values);
    if (settings.takesPoints)
        points_ = heldArrayOf<float>(blocks, "frames.points", product({settings.frames, settings.vertices, 3}));
    else
        matrices_ =
            heldArrayOf<float>(blocks, "frames.matrices", product({settings.frames, settings.matrices, affine}));
    if (settings.blendShapes != 0)
        weights_ = heldArrayOf<double>(blocks, "frames.weights", product({settings.frames, settings.blendShapes}));
    if (blocks.has("frames.envelope"))
        envelope_ = heldArrayOf<float>(blocks, "frames.envelope", settings.frames);
    if (blocks.has("check.frames")) {
        checkedFrames_ = blocks.held<std::uint32_t>("check.frames");
        checkBelow("check.frames", checkedFrames_.values, settings.frames, "frames");
        checkedSums_ = heldArrayOf<std::uint64_t>(blocks, "check.sums", checkedFrames_.values.size());
    }
}

void Motion::readMatrices(std::size_t frame, std::vector<rig::Affine>& matrices) const {
    const std::span<const float> numbers = rowOf(matrices_.values, frame);
    matrices.resize(numbers.size() / std::tuple_size_v<rig::Affine>);
    for (std::size_t i = 0; i < numbers.size(); ++i)
        matrices[i / std::tuple_size_v<rig::Affine>][i % std::tuple_size_v<rig::Affine>] =
            static_cast<double>(numbers[i]);
}

void Motion::readPoints(std::size_t frame, neuralWarp::Points& points) const {
    const std::span<const float> numbers = rowOf(points_.values, frame);
    points.resize(numbers.size() / 3);
    for (std::size_t i = 0; i < points.size(); ++i)
        points[i] = {numbers[3 * i], numbers[3 * i + 1], numbers[3 * i + 2]};
}

} // namespace viewer
