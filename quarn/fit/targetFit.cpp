// SPDX-License-Identifier: Apache-2.0
#include "quarn/fit/targetFit.h"

#include <algorithm>
#include <map>

namespace quarn {
namespace {

constexpr double hints = 0.6;        // of a shift: worth a word where the motion is too slow for a cause
constexpr double brings = 1.0 / 3.0; // the mean distance of before it, of a cause, down to this part

using Find = Finding (*)(const SkinFrames&, const CacheChange&);

// the kinds that have not been found yet; where two are alike, neither is the cause
std::map<Cause, Finding> findAll(const SkinFrames& skin, const TargetFit& fit) {
    const std::map<Cause, Find> kinds = {
        {Cause::shift, findShift}, {Cause::place, findPlace}, {Cause::order, findOrder}};
    std::map<Cause, Finding> findings;
    for (const auto& [cause, find] : kinds)
        if (std::find(fit.causes.begin(), fit.causes.end(), cause) == fit.causes.end())
            findings[cause] = find(skin, fit.change);
    return findings;
}

// the cause of those found that stands out; none where none does
const std::pair<const Cause, Finding>* outstanding(const std::map<Cause, Finding>& findings, double nothing) {
    const auto best = std::min_element(findings.begin(), findings.end(),
                                       [](const auto& a, const auto& b) { return a.second.after < b.second.after; });
    if (best == findings.end())
        return nullptr;
    const double near = std::max(alike * best->second.after, nothing);
    const bool isAlone =
        best->second.rival > near && std::none_of(findings.begin(), findings.end(), [&](const auto& of) {
            return of.first != best->first && of.second.after <= near;
        });
    const bool isMended = best->second.before > nothing && best->second.after < brings * best->second.before;
    return isAlone && isMended ? &*best : nullptr;
}

void noteShift(const std::map<Cause, Finding>& findings, TargetFit& fit) {
    const auto shift = findings.find(Cause::shift);
    if (shift == findings.end() || shift->second.after > hints * shift->second.before)
        return;
    fit.nearerShift = shift->second.change.shift;
    fit.nearerMean = shift->second.after;
}

void findCauses(const SkinFrames& skin, TargetFit& fit) {
    for (int round = 0; round < 3; ++round) {
        const std::map<Cause, Finding> findings = findAll(skin, fit);
        const auto* found = outstanding(findings, skin.nothing());
        if (found == nullptr)
            return noteShift(findings, fit);
        fit.causes.push_back(found->first);
        fit.change = found->second.change;
        if (found->first == Cause::order)
            fit.restFrame = found->second.restFrame;
        if (found->first == Cause::shift) {
            fit.leastShift = found->second.leastShift;
            fit.mostShift = found->second.mostShift;
        }
    }
}

// a shift by one frame adds its step to the distance at a right angle, and is found when that makes the distance three
// times what it was
bool isTooSlow(const TargetFit& fit, const SkinFrames& skin) {
    constexpr double times = 2.8; // sqrt(3² - 1)
    return fit.motion.ofAStep && fit.mended.mean > skin.nothing() && *fit.motion.ofAStep < times * fit.mended.mean &&
           std::find(fit.causes.begin(), fit.causes.end(), Cause::shift) == fit.causes.end();
}

} // namespace

bool isBeyondLimits(const FitDistance& distance, double diagonal) {
    return distance.mean > fitLimit::mean * diagonal || isBeyondAtRest(distance, diagonal);
}

bool isBeyondAtRest(const FitDistance& distance, double diagonal) {
    return distance.largestAtRest.value_or(0.0) > fitLimit::atRest * diagonal;
}

TargetFit fitTarget(const FitInput& input) {
    const SkinFrames skin(input);
    TargetFit fit;
    fit.diagonal = input.diagonal;
    fit.mended = fit.asItIs = skin.distanceTo({});
    if (fit.asItIs.mean > skin.nothing())
        findCauses(skin, fit);
    if (!fit.causes.empty())
        fit.mended = skin.distanceTo(fit.change);
    fit.motion = motionOf(skin, fit.change);
    fit.isTooSlow = isTooSlow(fit, skin);
    return fit;
}

} // namespace quarn
