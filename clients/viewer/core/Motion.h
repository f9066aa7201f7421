// SPDX-License-Identifier: Apache-2.0
// What the frames of a motion are computed from, and what should come of it.
#pragma once

#include "Settings.h"
#include "frame/Points.h"
#include "rig/linearBlend.h"
#include "viewer/Blocks.h"

#include <cstddef>
#include <cstdint>
#include <span>
#include <vector>

namespace viewer {

class Motion {
public:
    /// Reads frames.matrices, -weights, -controls, -envelope, -points and check.*. Throws std::runtime_error for blocks
    /// that do not fit.
    Motion(const Blocks& blocks, const Settings& settings);

    std::size_t frameCount() const { return frameCount_; }
    /// `matrices` resized to those of the skin.
    void readMatrices(std::size_t frame, std::vector<rig::Affine>& matrices) const;
    std::span<const double> weights(std::size_t frame) const { return rowOf(weights_.values, frame); }
    std::span<const float> controls(std::size_t frame) const { return rowOf(controls_.values, frame); }
    float envelope(std::size_t frame) const { return envelope_.values.empty() ? 1.0F : envelope_.values[frame]; }
    /// The points that come into the deformer, where frames have them. `points` resized to the vertices.
    void readPoints(std::size_t frame, neuralWarp::Points& points) const;

    /// Frames whose points have a stored sum, and the sums.
    std::span<const std::uint32_t> checkedFrames() const { return checkedFrames_.values; }
    std::span<const std::uint64_t> checkedSums() const { return checkedSums_.values; }

private:
    template <class T>
    std::span<const T> rowOf(std::span<const T> values, std::size_t frame) const {
        const std::size_t width = values.size() / frameCount_;
        return values.subspan(width * frame, width);
    }

    std::size_t frameCount_;
    HeldArray<float> matrices_, controls_, envelope_, points_;
    HeldArray<double> weights_;
    HeldArray<std::uint32_t> checkedFrames_;
    HeldArray<std::uint64_t> checkedSums_;
};

} // namespace viewer
