// SPDX-License-Identifier: Apache-2.0
#include "quarn/fit/findings.h"

#include <algorithm>
#include <cstdlib>
#include <map>

namespace quarn {
namespace {

// distances under one shift, and of the same frames under none
struct Tried {
    double sum = 0.0, unshifted = 0.0;
    std::size_t frames = 0;
    double mean() const { return sum / static_cast<double>(frames); }
};
using Trials = std::map<std::ptrdiff_t, Tried>;

// of each frame of the skin that has one of the cache without a shift: their distance
std::vector<double> unshiftedDistances(const SkinFrames& skin, const CacheChange& base) {
    std::vector<double> distances;
    std::vector<double> cache;
    for (const SkinFrames::Frame& frame : skin.frames()) {
        FitPairs pairs;
        if (const auto number = skin.cacheFrame(frame, base.shift)) {
            skin.input().cache(*number, cache);
            skin.addPairs(frame, cache, base, pairs);
        }
        distances.push_back(pairs.meanDistance());
    }
    return distances;
}

// each frame of the cache is read once, and compared with all frames of the skin that it could belong to
Trials tryAll(const SkinFrames& skin, const CacheChange& base) {
    const std::vector<double> unshifted = unshiftedDistances(skin, base);
    const auto reach = static_cast<std::ptrdiff_t>(skin.input().reach);
    Trials trials;
    std::vector<double> cache;
    for (std::size_t number = 0; number < skin.input().frames; ++number) {
        bool isRead = false;
        for (std::size_t i = 0; i < skin.frames().size(); ++i) {
            const SkinFrames::Frame& frame = skin.frames()[i];
            const std::ptrdiff_t shift =
                static_cast<std::ptrdiff_t>(number) - static_cast<std::ptrdiff_t>(frame.number);
            if (std::abs(shift) > reach)
                continue;
            if (!isRead)
                skin.input().cache(number, cache);
            isRead = true;
            FitPairs pairs;
            skin.addPairs(frame, cache, base, pairs);
            Tried& tried = trials[shift];
            tried.sum += pairs.meanDistance();
            tried.unshifted += unshifted[i];
            ++tried.frames;
        }
    }
    return trials;
}

// the largest mean distance of two frames of the skin: a shift cannot have cost more
double largestMotion(const SkinFrames& skin) {
    double largest = 0.0;
    for (const SkinFrames::Frame& frame : skin.frames())
        for (const SkinFrames::Frame& other : skin.frames())
            largest = std::max(largest, skin.meanDistance(frame, other));
    return largest;
}

// shifts that leave too few frames say little
void dropThin(Trials& trials, std::size_t frames) {
    const std::size_t enough = std::max<std::size_t>(2, (frames + 1) / 2);
    std::erase_if(trials, [&](const auto& trial) { return trial.first == 0 || trial.second.frames < enough; });
}

} // namespace

Finding findShift(const SkinFrames& skin, const CacheChange& base) {
    Finding finding;
    Trials trials = tryAll(skin, base);
    dropThin(trials, skin.frames().size());
    if (trials.empty())
        return finding;
    double best = std::numeric_limits<double>::infinity();
    for (const auto& [shift, tried] : trials)
        best = std::min(best, tried.mean());
    const double near = std::max(alike * best, skin.nothing());
    const auto isNear = [&](std::ptrdiff_t shift) {
        const auto trial = trials.find(shift);
        return trial != trials.end() && trial->second.mean() <= near;
    };
    // where a motion repeats itself, the nearest of its returns
    std::ptrdiff_t chosen = 0;
    for (std::ptrdiff_t away = 1; chosen == 0; ++away)
        chosen = isNear(away) ? away : isNear(-away) ? -away : 0;
    finding.leastShift = finding.mostShift = chosen;
    while (isNear(finding.leastShift - 1))
        --finding.leastShift;
    while (isNear(finding.mostShift + 1))
        ++finding.mostShift;
    for (std::ptrdiff_t shift = finding.leastShift; shift <= finding.mostShift; ++shift)
        if (trials.at(shift).mean() < trials.at(chosen).mean())
            chosen = shift;
    const Tried& tried = trials.at(chosen);
    finding.change = base;
    finding.change.shift = chosen;
    finding.after = tried.mean();
    finding.before = tried.unshifted / static_cast<double>(tried.frames);
    if (largestMotion(skin) < finding.before - finding.after)
        return {}; // a skin that keeps still is the same under every shift: the cache has quieter frames, and no more
    return finding;
}

} // namespace quarn
