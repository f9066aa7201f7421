// SPDX-License-Identifier: Apache-2.0
// The likely causes of frames that are not on the skin, a kind at a time: each is tried in all its forms.
#pragma once

#include "quarn/fit/CacheChange.h"
#include "quarn/fit/SkinFrames.h"

#include <limits>

namespace quarn {

/// The best form of a kind. All distances are means over sampled vertices of the same frames.
struct Finding {
    CacheChange change; ///< what it was looked for on top of, and itself
    double before = std::numeric_limits<double>::infinity();
    double after = std::numeric_limits<double>::infinity();
    double rival = std::numeric_limits<double>::infinity(); ///< of the next form that does something else
    /// Of a shift: neighbouring shifts that come as near, itself among them.
    std::ptrdiff_t leastShift = 0, mostShift = 0;
    /// Of an order: the frame of the cache that tells it, if the skin is at rest there.
    std::optional<std::size_t> restFrame;
};

/// What corrections do not go beyond.
namespace fitLimit {
inline constexpr double mean = 0.1;    // of the diagonal
inline constexpr double atRest = 0.05; // of the diagonal, of any vertex
} // namespace fitLimit

/// Distances within this factor are alike.
constexpr double alike = 1.25;

/// The cache is early or late by up to input.reach frames. Reads each frame of the cache at most once.
Finding findShift(const SkinFrames& skin, const CacheChange& base);
/// Its unit is another, its axes are turned or mirrored, both, or it lies beside the skin.
Finding findPlace(const SkinFrames& skin, const CacheChange& base);
/// Its vertices are in another order, which their places at rest tell.
Finding findOrder(const SkinFrames& skin, const CacheChange& base);

} // namespace quarn
