// SPDX-License-Identifier: Apache-2.0
// The two files that tell quarn import what a character file does not say.
#pragma once

#include "quarn/import/reparent.h"

#include <array>
#include <filesystem>
#include <map>
#include <optional>
#include <string>
#include <utility>
#include <vector>

namespace quarn {

/// Least and largest value, least below largest.
using ValueRange = std::pair<double, double>;
/// Of rotateX, rotateY and rotateZ, in radians; none where an axis is not posed.
using JointLimits = std::array<std::optional<ValueRange>, 3>;
/// By the name of the joint in its file.
using LimitMap = std::map<std::string, JointLimits>;
/// Of weights, by the name of the slider in the scene: "head_sliders.jawOpen".
using SliderLimitMap = std::map<std::string, ValueRange>;

struct PoseLimits {
    LimitMap joints;
    SliderLimitMap sliders;
};

/// {"child joint": "parent joint", ...}. Throws std::runtime_error, naming file and place, for anything else and for a
/// joint that stands twice.
ParentMap readParents(const std::filesystem::path& file);

/// {"joint": {"rotateX": [least, largest], ...}, "slider": [least, largest], ...}, angles in degrees. Throws as
/// readParents() does, and for an axis that is not one of the three, or a range of no width.
PoseLimits readLimits(const std::filesystem::path& file);

/// The same file of limits, joints and then sliders in this order: to be edited, and read by readLimits(). Four digits
/// behind the point, rounded so that no range gets smaller.
std::string limitsText(const std::vector<std::pair<std::string, JointLimits>>& joints,
                       const std::vector<std::pair<std::string, ValueRange>>& sliders);

} // namespace quarn
