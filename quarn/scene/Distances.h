// SPDX-License-Identifier: Apache-2.0
// How far two moving meshes are from each other, vertex by vertex, over all frames; in memory that does not grow with
// the frames.
#pragma once

#include <cstddef>
#include <cstdint>
#include <span>
#include <vector>

namespace quarn {

/// Distances of any number of vertices: exact mean and maximum, and percentiles by counting.
class Distances {
public:
    /// Adds one frame: `a` and `b` x, y, z of every vertex, equally many, finite. Units of the scene.
    void add(int frame, std::span<const float> a, std::span<const float> b);

    std::uint64_t count() const { return count_; }
    double mean() const;
    double largest() const { return largest_; }
    int worstFrame() const { return worstFrame_; }
    std::size_t worstVertex() const { return worstVertex_; }
    /// What the given part (0 to 1) of all distances did not exceed, by nearest rank; at most 1/1024 too large, never
    /// too small. 0 without distances.
    double percentile(double part) const;

private:
    void addOne(int frame, std::size_t vertex, double distance);

    std::vector<std::uint64_t> counts_; ///< of distances, by their leading bits; made with the first distance
    std::uint64_t count_ = 0;
    double sum_ = 0.0;
    double largest_ = -1.0;
    int worstFrame_ = 0;
    std::size_t worstVertex_ = 0;
};

/// The largest second difference |x(t+1) - 2 x(t) + x(t-1)| that a vertex makes: how much a motion trembles.
class Jitter {
public:
    /// Adds the next frame; frames have to follow each other at the same step, with equally many vertices.
    void add(std::span<const float> xyz);
    /// 0 with fewer than three frames.
    double largest() const { return largest_; }

private:
    std::vector<float> before_, last_;
    double largest_ = 0.0;
};

} // namespace quarn
