// SPDX-License-Identifier: Apache-2.0
#include "quarn/fit/following.h"

namespace quarn {
namespace {

// With s how far the skin is from its mean over the frames, and c the same of the cache, the slope is sum(c * s)
// divided by sum(s * s). If the cache is the skin and a correction e, that is 1 + sum(e * s) / sum(s * s), and the
// second term is small as long as the skin moves by a good part of e; for poses that have nothing to do with each other
// it is 0, give or take what a few frames scatter: 0.2 for eleven frames of two angles.
constexpr double followsFrom = 0.6;
constexpr double moves = 0.7; // of what the correction does: a skin that moves less leaves the slope to it
constexpr std::size_t enoughFrames = 4;

struct Mean {
    double sum = 0.0;
    std::size_t count = 0;
    void add(double value) {
        sum += value;
        ++count;
    }
    double value() const { return count > 0 ? sum / static_cast<double>(count) : 0.0; }
};

using Frames = std::vector<const SkinFrames::Frame*>;

Frames posedFrames(const SkinFrames& skin, const CacheChange& change) {
    Frames frames;
    for (const SkinFrames::Frame& frame : skin.frames())
        if (!frame.atRest && skin.cacheFrame(frame, change.shift))
            frames.push_back(&frame);
    return frames;
}

std::optional<double> motionOfAStep(const SkinFrames& skin) {
    Mean step;
    for (std::size_t i = 0; i + 1 < skin.frames().size(); ++i)
        if (skin.frames()[i + 1].number == skin.frames()[i].number + 1)
            step.add(skin.meanDistance(skin.frames()[i], skin.frames()[i + 1]));
    return step.count > 0 ? std::optional(step.value()) : std::nullopt;
}

double motionBetween(const SkinFrames& skin, const Frames& frames) {
    Mean motion;
    for (std::size_t i = 0; i < frames.size(); ++i)
        for (std::size_t j = i + 1; j < frames.size(); ++j)
            motion.add(skin.meanDistance(*frames[i], *frames[j]));
    return motion.value();
}

// of the same vertices in all frames
std::vector<FitPairs> pairsOf(const SkinFrames& skin, const Frames& frames, const CacheChange& change) {
    std::vector<FitPairs> all;
    std::vector<double> cache;
    for (const SkinFrames::Frame* frame : frames) {
        skin.input().cache(*skin.cacheFrame(*frame, change.shift), cache);
        skin.addPairs(*frame, cache, change, all.emplace_back());
        if (all.back().skin.size() != all.front().skin.size())
            return {}; // some are not finite, and what is left does not go together
    }
    return all;
}

FitPoint meanOf(const std::vector<FitPairs>& frames, std::vector<FitPoint> FitPairs::*points, std::size_t i) {
    FitPoint mean{};
    for (const FitPairs& frame : frames)
        for (std::size_t axis = 0; axis < 3; ++axis)
            mean[axis] += (frame.*points)[i][axis] / static_cast<double>(frames.size());
    return mean;
}

struct Regression {
    double slope = 0.0;
    Mean rest; ///< how far the correction is from its mean over the frames
};

Regression regressionOf(const std::vector<FitPairs>& frames) {
    Regression regression;
    double both = 0.0, skinAlone = 0.0;
    for (std::size_t i = 0; i < frames.front().skin.size(); ++i) {
        const FitPoint skinMean = meanOf(frames, &FitPairs::skin, i);
        const FitPoint cacheMean = meanOf(frames, &FitPairs::cache, i);
        for (const FitPairs& frame : frames) {
            FitPoint s{}, c{};
            for (std::size_t axis = 0; axis < 3; ++axis) {
                s[axis] = frame.skin[i][axis] - skinMean[axis];
                c[axis] = frame.cache[i][axis] - cacheMean[axis];
                both += s[axis] * c[axis];
                skinAlone += s[axis] * s[axis];
            }
            regression.rest.add(fitDistance(s, c));
        }
    }
    regression.slope = both / skinAlone;
    return regression;
}

Following followingOf(const SkinFrames& skin, const std::vector<FitPairs>& frames, double motion) {
    if (frames.size() < enoughFrames || motion <= skin.nothing())
        return Following::untold;
    const Regression regression = regressionOf(frames);
    if (motion <= moves * regression.rest.value())
        return Following::untold;
    return regression.slope < followsFrom ? Following::no : Following::yes;
}

} // namespace

CacheMotion motionOf(const SkinFrames& skin, const CacheChange& change) {
    const Frames frames = posedFrames(skin, change);
    CacheMotion motion;
    motion.posedFrames = frames.size();
    motion.size = motionBetween(skin, frames);
    motion.ofAStep = motionOfAStep(skin);
    motion.following = followingOf(skin, pairsOf(skin, frames, change), motion.size);
    return motion;
}

} // namespace quarn
