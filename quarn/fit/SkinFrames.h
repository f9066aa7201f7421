// SPDX-License-Identifier: Apache-2.0
// A spread of frames of the skin, to which a cache is compared in one way after another.
#pragma once

#include "quarn/fit/CacheChange.h"
#include "quarn/fit/FitInput.h"

#include <optional>
#include <span>
#include <vector>

namespace quarn {

/// How far the frames of a cache are from the skin.
struct FitDistance {
    double mean = 0.0;
    double largest = 0.0;
    /// The largest of the frame at rest in which it is least; none where no frame that was looked at is at rest. A face
    /// whose skin keeps still has many such frames, and targets in them that do not: the least is that of its rest
    /// pose.
    std::optional<double> largestAtRest;
    std::size_t frames = 0; ///< that were looked at

    struct Place {
        std::size_t frame, vertex; ///< of the cache, of the mesh
    };
    std::optional<Place> notFinite; ///< the first position of the cache that is none; it counts nowhere
};

/// Sampled points of several frames, frame after frame.
struct FitPairs {
    std::vector<FitPoint> skin, cache; ///< as many of both

    double meanDistance() const;
};

/// Up to twelve frames of the skin, in pairs of neighbours that are spread evenly over all frames. They are read once,
/// in the constructor, and held in single precision.
class SkinFrames {
public:
    struct Frame {
        std::size_t number;
        std::vector<float> xyz;
        bool atRest; ///< hardly anything is away from where it is at rest
    };

    /// `input` must outlive this. Throws as input.skin does.
    explicit SkinFrames(const FitInput& input);

    const FitInput& input() const { return input_; }
    const std::vector<Frame>& frames() const { return frames_; }

    /// Over all vertices. Frames that the shift leaves without one of the cache are passed over.
    FitDistance distanceTo(const CacheChange& change) const;
    /// About a thousand vertices a frame, the same ones in all, without those that are not finite.
    FitPairs pairs(const CacheChange& change) const;
    /// The same of one frame of the skin and a frame of the cache as it was read.
    void addPairs(const Frame& frame, std::span<const double> cache, const CacheChange& change, FitPairs& pairs) const;
    /// Mean distance of two frames of the skin.
    double meanDistance(const Frame& a, const Frame& b) const;
    /// The frame of the cache that a frame of the skin has under a shift; none beyond its ends.
    std::optional<std::size_t> cacheFrame(const Frame& frame, std::ptrdiff_t shift) const;
    /// Distances below this are nothing that a cause could be looked for.
    double nothing() const { return 1e-5 * input_.diagonal; }

private:
    const FitInput& input_;
    std::size_t stride_; ///< between two sampled vertices
    std::vector<Frame> frames_;
};

FitPoint fitPoint(std::span<const float> xyz, std::size_t vertex);

} // namespace quarn
