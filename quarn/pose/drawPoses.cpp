// SPDX-License-Identifier: Apache-2.0
#include "quarn/pose/drawPoses.h"

#include <algorithm>
#include <random>

namespace quarn {
namespace {

// the engine's bits are specified, those of the standard distributions are not (decision 0073)
class Dice {
public:
    explicit Dice(std::uint64_t seed)
        : engine_(seed) {}
    /// One of the 2^53 multiples of 2^-53 from 0 on, below 1.
    double throwOnce() { return static_cast<double>(engine_() >> 11U) * 0x1p-53; }

private:
    std::mt19937_64 engine_;
};

double drawValue(const ValueLimits& limits, const DrawSettings& settings, Dice& dice) {
    if (dice.throwOnce() >= settings.activationRate)
        return limits.rest;
    // without such a rate there is no throw for it: the poses of a seed stay those that they were
    if (settings.limitRate > 0.0 && dice.throwOnce() < settings.limitRate)
        return dice.throwOnce() < 0.5 ? limits.least : limits.most;
    const double part = dice.throwOnce();
    return std::clamp(limits.least * (1.0 - part) + limits.most * part, limits.least, limits.most);
}

} // namespace

std::size_t drawPoses(PoseSet& poses, const DrawSettings& settings, const std::function<void(std::size_t)>& step) {
    Dice dice(settings.seed);
    std::vector<double> pose(poses.limits().size());
    std::size_t dropped = 0;
    for (std::size_t inVain = 0; poses.count() < settings.count && inVain < drawsInVain;) {
        std::transform(poses.limits().begin(), poses.limits().end(), pose.begin(),
                       [&](const ValueLimits& limits) { return drawValue(limits, settings, dice); });
        const bool isNew = poses.add(pose);
        inVain = isNew ? 0U : inVain + 1;
        dropped += isNew ? 0U : 1U;
        step(isNew ? 1 : 0);
    }
    return dropped;
}

} // namespace quarn
