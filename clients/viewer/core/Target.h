// SPDX-License-Identifier: Apache-2.0
// Where the vertices should be, and how far from there they are.
#pragma once

#include "Settings.h"
#include "frame/Points.h"
#include "viewer/Blocks.h"

#include <cstddef>
#include <cstdint>
#include <span>
#include <vector>

namespace viewer {

/// The target of every frame: its points, or the distances to it, or neither. One thread at a time.
class Target {
public:
    /// Reads target.*, errors.* and scale. Throws std::runtime_error for blocks that do not fit.
    Target(const Blocks& blocks, const Settings& settings);

    bool hasPoints() const { return !points_.values.empty(); }
    bool hasErrors() const { return hasPoints() || !before_.values.empty(); }
    /// The points of a frame; `points` resized. Only while hasPoints().
    void read(std::size_t frame, neuralWarp::Points& points) const;
    /// Distances in mm from points to those of the target, both [vertices]; `distances` resized.
    void measure(const neuralWarp::Points& points, const neuralWarp::Points& target,
                 std::vector<float>& distances) const;
    /// The stored ones of a frame, before or after the model has been applied. Only while hasErrors() and not
    /// hasPoints().
    void readErrors(std::size_t frame, bool isAfter, std::vector<float>& distances) const;

private:
    std::size_t vertices_;
    HeldArray<std::int16_t> points_;
    HeldArray<double> box_; // least x, y, z, and what there is from there to the most
    HeldArray<std::uint8_t> before_, after_;
    double range_ = 0.0; // mm
    double scale_ = 1.0; // mm per unit
};

} // namespace viewer
