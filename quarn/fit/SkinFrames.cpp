// SPDX-License-Identifier: Apache-2.0
#include "quarn/fit/SkinFrames.h"

#include <algorithm>
#include <cmath>
#include <limits>

namespace quarn {
namespace {

constexpr std::size_t places = 6; // of a pair of neighbours each
constexpr std::size_t sampledVertices = 1024;
constexpr double atRest = 2e-3; // of the diagonal, of any vertex: a face moves few of its vertices

std::vector<std::size_t> spread(std::size_t first, std::size_t last) {
    const std::size_t count = last - first + 1;
    std::vector<std::size_t> numbers;
    if (count <= 2 * places) {
        for (std::size_t number = first; number <= last; ++number)
            numbers.push_back(number);
        return numbers;
    }
    for (std::size_t place = 0; place < places; ++place) {
        const std::size_t number = first + place * (count - 2) / (places - 1);
        numbers.insert(numbers.end(), {number, number + 1});
    }
    return numbers;
}

// as a position of the scene, which has single precision
bool isFinite(const FitPoint& point) {
    return std::all_of(point.begin(), point.end(), [](double x) { return std::isfinite(static_cast<float>(x)); });
}

double largestDistanceToRest(const FitInput& input, std::span<const float> xyz) {
    double largest = 0.0;
    for (std::size_t vertex = 0; vertex < input.vertices; ++vertex)
        largest = std::max(largest, fitDistance(fitPoint(xyz, vertex), CacheChange{}.of(input.rest, vertex)));
    return largest;
}

// a frame after the other, and what they come to
struct Sum {
    double total = 0.0;
    std::size_t count = 0;
    FitDistance distance;

    void add(const SkinFrames::Frame& frame, std::size_t number, std::span<const double> cache,
             const CacheChange& change) {
        double largest = 0.0;
        for (std::size_t vertex = 0; vertex < frame.xyz.size() / 3; ++vertex) {
            const FitPoint point = change.of(cache, vertex);
            if (!isFinite(point)) {
                if (!distance.notFinite)
                    distance.notFinite = {number, vertex};
                continue;
            }
            const double apart = fitDistance(point, fitPoint(frame.xyz, vertex));
            total += apart;
            ++count;
            largest = std::max(largest, apart);
        }
        ++distance.frames;
        distance.largest = std::max(distance.largest, largest);
        if (frame.atRest)
            distance.largestAtRest = std::min(largest, distance.largestAtRest.value_or(largest));
    }
};

} // namespace

FitPoint fitPoint(std::span<const float> xyz, std::size_t vertex) {
    return {xyz[3 * vertex], xyz[3 * vertex + 1], xyz[3 * vertex + 2]};
}

double FitPairs::meanDistance() const {
    if (skin.empty())
        return std::numeric_limits<double>::infinity();
    double sum = 0.0;
    for (std::size_t i = 0; i < skin.size(); ++i)
        sum += fitDistance(skin[i], cache[i]);
    return sum / static_cast<double>(skin.size());
}

SkinFrames::SkinFrames(const FitInput& input)
    : input_(input)
    , stride_(std::max<std::size_t>(1, input.vertices / sampledVertices)) {
    std::vector<double> xyz;
    for (const std::size_t number : spread(input.first, input.last)) {
        input.skin(number, xyz);
        Frame frame{number, std::vector<float>(xyz.begin(), xyz.end()), false};
        frame.atRest = largestDistanceToRest(input, frame.xyz) <= atRest * input.diagonal;
        frames_.push_back(std::move(frame));
    }
}

std::optional<std::size_t> SkinFrames::cacheFrame(const Frame& frame, std::ptrdiff_t shift) const {
    const std::ptrdiff_t number = static_cast<std::ptrdiff_t>(frame.number) + shift;
    if (number < 0 || number >= static_cast<std::ptrdiff_t>(input_.frames))
        return {};
    return static_cast<std::size_t>(number);
}

FitDistance SkinFrames::distanceTo(const CacheChange& change) const {
    Sum sum;
    std::vector<double> cache;
    for (const Frame& frame : frames_)
        if (const auto number = cacheFrame(frame, change.shift)) {
            input_.cache(*number, cache);
            sum.add(frame, *number, cache, change);
        }
    sum.distance.mean =
        sum.count > 0 ? sum.total / static_cast<double>(sum.count) : std::numeric_limits<double>::infinity();
    return sum.distance;
}

void SkinFrames::addPairs(const Frame& frame, std::span<const double> cache, const CacheChange& change,
                          FitPairs& pairs) const {
    for (std::size_t vertex = 0; vertex < input_.vertices; vertex += stride_)
        if (const FitPoint point = change.of(cache, vertex); isFinite(point)) {
            pairs.skin.push_back(fitPoint(frame.xyz, vertex));
            pairs.cache.push_back(point);
        }
}

FitPairs SkinFrames::pairs(const CacheChange& change) const {
    FitPairs pairs;
    std::vector<double> cache;
    for (const Frame& frame : frames_)
        if (const auto number = cacheFrame(frame, change.shift)) {
            input_.cache(*number, cache);
            addPairs(frame, cache, change, pairs);
        }
    return pairs;
}

double SkinFrames::meanDistance(const Frame& a, const Frame& b) const {
    double sum = 0.0;
    std::size_t count = 0;
    for (std::size_t vertex = 0; vertex < input_.vertices; vertex += stride_, ++count)
        sum += fitDistance(fitPoint(a.xyz, vertex), fitPoint(b.xyz, vertex));
    return sum / static_cast<double>(count);
}

} // namespace quarn
