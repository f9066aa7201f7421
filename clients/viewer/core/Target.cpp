// SPDX-License-Identifier: Apache-2.0
#include "Target.h"

#include "checks.h"

#include <cmath>

namespace viewer {

Target::Target(const Blocks& blocks, const Settings& settings)
    : vertices_(settings.vertices) {
    const std::uint64_t vertices = product({settings.frames, settings.vertices});
    scale_ = arrayOf<double>(blocks, "scale", 1)[0];
    if (blocks.has("target.points")) {
        points_ = heldArrayOf<std::int16_t>(blocks, "target.points", product({vertices, 3}));
        box_ = heldArrayOf<double>(blocks, "target.box", 6);
    } else if (blocks.has("errors.before")) {
        before_ = heldArrayOf<std::uint8_t>(blocks, "errors.before", vertices);
        after_ = heldArrayOf<std::uint8_t>(blocks, "errors.after", vertices);
        range_ = arrayOf<double>(blocks, "errors.range", 1)[0];
    }
}

void Target::read(std::size_t frame, neuralWarp::Points& points) const {
    points.resize(vertices_);
    const std::int16_t* numbers = points_.values.data() + 3 * vertices_ * frame;
    const double* box = box_.values.data();
    const auto coordinate = [&](std::size_t axis) {
        return static_cast<float>(box[axis] + box[3 + axis] * (numbers[axis] + 32768.0) / 65535.0);
    };
    for (quill::val3<float>& point : points) {
        point = {coordinate(0), coordinate(1), coordinate(2)};
        numbers += 3;
    }
}

void Target::measure(const neuralWarp::Points& points, const neuralWarp::Points& target,
                     std::vector<float>& distances) const {
    distances.resize(vertices_);
    for (std::size_t i = 0; i < vertices_; ++i) {
        const quill::val3<double> difference(static_cast<double>(points[i].x) - static_cast<double>(target[i].x),
                                             static_cast<double>(points[i].y) - static_cast<double>(target[i].y),
                                             static_cast<double>(points[i].z) - static_cast<double>(target[i].z));
        distances[i] = static_cast<float>(difference.length() * scale_);
    }
}

void Target::readErrors(std::size_t frame, bool isAfter, std::vector<float>& distances) const {
    distances.resize(vertices_);
    const std::uint8_t* numbers = (isAfter ? after_ : before_).values.data() + vertices_ * frame;
    for (std::size_t i = 0; i < vertices_; ++i)
        distances[i] = static_cast<float>(numbers[i] / 255.0 * range_);
}

} // namespace viewer
