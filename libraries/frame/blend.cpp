// SPDX-License-Identifier: Apache-2.0
#include "frame/blend.h"

#include "quill/parallelFor.h"

namespace neuralWarp {
namespace {

double moved(double p, float c, double f) {
    return p + (static_cast<double>(c) - p) * f;
}

// What most frames are: every vertex goes to the model's position, by the same part of the way.
template <class Coordinate>
void blendTowardsModel(const Coordinate* from, Coordinate* to, const Points& model, double f) {
    const float* const c = &model.front().x; // x, y and z follow each other, as in the positions
    quill::parallelForRange(
        model.size(),
        [=](int begin, int end) {
            for (std::ptrdiff_t i = std::ptrdiff_t{3} * begin; i < std::ptrdiff_t{3} * end; ++i)
                to[i] = static_cast<Coordinate>(moved(static_cast<double>(from[i]), c[i], f));
        },
        quill::copyGrain);
}

template <class Coordinate>
void blendEach(const MovedPointsOf<Coordinate>& points, const float* weights, const Blend& blend, std::size_t i) {
    const std::size_t at = 3 * std::size_t{points.vertices ? points.vertices[i] : i};
    const Coordinate* const p = points.from + at;
    quill::val3<float> c{static_cast<float>(p[0]), static_cast<float>(p[1]), static_cast<float>(p[2])};
    if (blend.model && blend.driven.contains(i))
        c = (*blend.model)[i];
    if (blend.target)
        c = c + ((*blend.target)[i] - c) * blend.targetWeight;
    const auto f = static_cast<double>(weights ? weights[i] * blend.envelope : blend.envelope);
    for (std::size_t axis = 0; axis < 3; ++axis)
        points.to[at + axis] = static_cast<Coordinate>(moved(static_cast<double>(p[axis]), c[axis], f));
}

template <class Coordinate>
void blendAll(const MovedPointsOf<Coordinate>& points, const float* weights, const Blend& blend) {
    if (points.count == 0)
        return;
    if (blend.model && !blend.target && !blend.driven.slots && !weights && !points.vertices)
        blendTowardsModel(points.from, points.to, *blend.model, static_cast<double>(blend.envelope));
    else
        quill::parallelFor(
            points.count, [&](std::size_t i) { blendEach(points, weights, blend, i); }, quill::copyGrain);
}

} // namespace

void blendPositions(const MovedPoints& points, const float* weights, const Blend& blend) {
    blendAll(points, weights, blend);
}

void blendPositions(const MovedPointsOf<float>& points, const float* weights, const Blend& blend) {
    blendAll(points, weights, blend);
}

} // namespace neuralWarp
