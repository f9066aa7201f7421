// SPDX-License-Identifier: Apache-2.0
// How far a moving mesh is from its target: over all, of each frame, of each vertex, and how that trembles.
#pragma once

#include "quarn/scene/Distances.h"

#include <cstddef>
#include <cstdint>
#include <span>
#include <vector>

namespace quarn {

/// Of distances, in mm.
struct MeanAndMax {
    double mean = 0.0, max = 0.0;
};

/// How many distances lie between two that follow each other on a scale of powers of ten.
class DistanceBins {
public:
    static constexpr int perDecade = 8;
    static constexpr int firstDecade = -6, lastDecade = 6; ///< 1e-6 mm to 1e6 mm: what is beyond is in the outer bins
    static constexpr std::size_t count = std::size_t{perDecade} * (lastDecade - firstDecade);

    void add(double millimetres);
    /// [count], the smallest distances first.
    const std::vector<std::uint64_t>& counts() const { return counts_; }
    /// The least distance of a bin, in mm; of `count` the end of the last one.
    static double edge(std::size_t bin);

private:
    std::vector<std::uint64_t> counts_ = std::vector<std::uint64_t>(count, 0);
};

/// The second differences e(t+1) - 2 e(t) + e(t-1) of what is left, in mm: how a mesh trembles where its target does
/// not.
class ErrorJitter {
public:
    /// `left` [3n], mm, of the next frame: frames have to follow each other at the same step.
    void add(std::vector<double> left);
    MeanAndMax figures() const { return {count_ > 0 ? sum_ / static_cast<double>(count_) : 0.0, largest_}; }

private:
    std::vector<double> before_, last_;
    double sum_ = 0.0, largest_ = 0.0;
    std::uint64_t count_ = 0;
};

/// Memory grows by 16 bytes a frame. Thread: one at a time.
class MeshErrors {
public:
    /// `millimetres`: of a unit of the scene.
    explicit MeshErrors(double millimetres)
        : millimetres_(millimetres) {}

    /// Both [3n] x, y, z in units of the scene, finite; n is that of the first frame.
    void add(int frame, std::span<const float> points, std::span<const float> target);

    double mean() const { return distances_.mean() * millimetres_; }
    double largest() const { return distances_.largest() * millimetres_; }
    /// Distances::percentile(), in mm.
    double percentile(double part) const { return distances_.percentile(part) * millimetres_; }
    int worstFrame() const { return distances_.worstFrame(); }
    std::size_t worstVertex() const { return distances_.worstVertex(); }

    const std::vector<MeanAndMax>& frames() const { return frames_; } ///< in the order of adding
    std::vector<MeanAndMax> vertices() const;                         ///< [n]
    const DistanceBins& bins() const { return bins_; }
    double jitter() const { return jitter_.largest() * millimetres_; } ///< of the points
    MeanAndMax errorJitter() const { return errorJitter_.figures(); }

private:
    double millimetres_;
    Distances distances_;
    DistanceBins bins_;
    Jitter jitter_;
    ErrorJitter errorJitter_;
    std::vector<MeanAndMax> frames_;
    std::vector<double> sums_, largest_; ///< of each vertex, mm
};

} // namespace quarn
