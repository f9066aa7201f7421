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

/// Of rotateX, rotateY and rotateZ, in radians: least and largest angle, least below largest; none where an axis is
/// not posed.
using JointLimits = std::array<std::optional<std::pair<double, double>>, 3>;
/// By the name of the joint in its file.
using LimitMap = std::map<std::string, JointLimits>;

/// {"child joint": "parent joint", ...}. Throws std::runtime_error, naming file and place, for anything else and for a
/// joint that stands twice.
ParentMap readParents(const std::filesystem::path& file);

/// {"joint": {"rotateX": [least, largest], ...}, ...} in degrees. Throws as readParents() does, and for an axis that is
/// not one of the three, or a range of no width.
LimitMap readLimits(const std::filesystem::path& file);

/// The same file of limits, joints in this order: to be edited, and read by readLimits(). Degrees with four digits
/// behind the point, rounded so that no range gets smaller.
std::string limitsText(const std::vector<std::pair<std::string, JointLimits>>& joints);

} // namespace quarn
