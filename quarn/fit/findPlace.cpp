// SPDX-License-Identifier: Apache-2.0
#include "quarn/fit/findings.h"

#include <algorithm>
#include <iterator>

namespace quarn {
namespace {

constexpr std::size_t triedPairs = 4096;

// units that a cache may have been written in, against that of the scene: tens, inches, feet
constexpr double inch = 0.0254, foot = 0.3048;
constexpr std::array factors = {0.01,         100.0,        0.1,         10.0, 0.001,      1000.0, 1000.0 * inch,
                                0.001 / inch, 100.0 * inch, 0.01 / inch, inch, 1.0 / inch, foot,   1.0 / foot};

// what is more likely comes first, and nothing at all at the very front
std::vector<AxisTurn> allTurns() {
    std::vector<AxisTurn> turns;
    std::array<int, 3> from{0, 1, 2};
    do
        for (unsigned signs = 0; signs < 8; ++signs) {
            AxisTurn turn;
            turn.from = from;
            for (std::size_t axis = 0; axis < 3; ++axis)
                turn.sign[axis] = (signs >> axis & 1U) != 0 ? -1 : 1;
            turns.push_back(turn);
        }
    while (std::next_permutation(from.begin(), from.end()));
    const auto rank = [](const AxisTurn& turn) {
        if (turn.isNone() || turn == fromZUp || turn == fromYUp)
            return turn.isNone() ? 0 : 1;
        return turn.isMirror() ? 3 : 2;
    };
    std::stable_sort(turns.begin(), turns.end(),
                     [&](const AxisTurn& a, const AxisTurn& b) { return rank(a) < rank(b); });
    return turns;
}

FitPairs moved(const FitPairs& pairs, const CacheChange& change) {
    FitPairs result = pairs;
    for (FitPoint& point : result.cache)
        point = change.moved(point);
    return result;
}

CacheChange changeBy(const AxisTurn& turn, double scale) {
    CacheChange change;
    change.axes = turn;
    change.scale = scale;
    return change;
}

CacheChange offsetOf(const FitPairs& pairs) {
    CacheChange change;
    for (std::size_t i = 0; i < pairs.skin.size(); ++i)
        for (std::size_t axis = 0; axis < 3; ++axis)
            change.offset[axis] +=
                (pairs.skin[i][axis] - pairs.cache[i][axis]) / static_cast<double>(pairs.skin.size());
    return change;
}

// one thing before two
std::vector<CacheChange> allPlaces(const FitPairs& pairs, double nearEnough) {
    const std::vector<AxisTurn> turns = allTurns();
    std::vector<CacheChange> places;
    places.reserve(turns.size() * (factors.size() + 1));
    for (const double factor : factors)
        places.push_back(changeBy({}, factor));
    for (const AxisTurn& turn : turns)
        if (!turn.isNone())
            places.push_back(changeBy(turn, 1.0));
    // whatever lies far away is nearer when it has been moved: that it lies on the skin then is what tells
    if (const CacheChange offset = offsetOf(pairs); moved(pairs, offset).meanDistance() <= nearEnough)
        places.push_back(offset);
    for (const AxisTurn& turn : turns)
        for (const double factor : factors)
            if (!turn.isNone())
                places.push_back(changeBy(turn, factor));
    return places;
}

FitPairs thinned(const FitPairs& all) {
    const std::size_t stride = std::max<std::size_t>(1, all.skin.size() / triedPairs);
    FitPairs some;
    for (std::size_t i = 0; i < all.skin.size(); i += stride) {
        some.skin.push_back(all.skin[i]);
        some.cache.push_back(all.cache[i]);
    }
    return some;
}

double distanceBetween(const FitPairs& a, const FitPairs& b) {
    return FitPairs{a.cache, b.cache}.meanDistance();
}

} // namespace

Finding findPlace(const SkinFrames& skin, const CacheChange& base) {
    Finding finding;
    const FitPairs pairs = thinned(skin.pairs(base));
    if (pairs.skin.empty())
        return finding;
    const std::vector<CacheChange> places = allPlaces(pairs, fitLimit::mean * skin.input().diagonal);
    std::vector<double> means;
    means.reserve(places.size());
    for (const CacheChange& place : places)
        means.push_back(moved(pairs, place).meanDistance());
    const auto best = std::min_element(means.begin(), means.end());
    // of a flat mesh, say, several forms are the same
    const FitPairs bestPairs = moved(pairs, places[static_cast<std::size_t>(best - means.begin())]);
    const double same = std::max(0.1 * *best, skin.nothing());
    bool isChosen = false;
    for (std::size_t i = 0; i < places.size(); ++i) {
        const bool isNear = means[i] <= alike * *best + skin.nothing();
        if (!isNear || distanceBetween(moved(pairs, places[i]), bestPairs) > same) {
            finding.rival = std::min(finding.rival, means[i]);
        } else if (!isChosen) {
            finding.change = base;
            finding.change.axes = places[i].axes;
            finding.change.scale = places[i].scale;
            finding.change.offset = places[i].offset;
            finding.after = means[i];
            isChosen = true;
        }
    }
    finding.before = pairs.meanDistance();
    return finding;
}

} // namespace quarn
