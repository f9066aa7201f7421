// SPDX-License-Identifier: Apache-2.0
// The joints of an open scene: what hangs below what, what is posed and how far, and what each moves.
#pragma once

#include "quarn/console/json.h"

#include <cstddef>
#include <string>
#include <vector>

namespace quarn {

struct JointReport {
    /// An angle that sampling sets, or another value of the joint; angles in radians.
    struct Axis {
        std::string name; ///< rotateX and the like
        double least = 0.0, most = 0.0, rest = 0.0;
    };
    std::string name;
    std::string parent; ///< empty for a root
    std::string rotateOrder;
    std::vector<Axis> axes;   ///< none: it is not posed
    std::size_t vertices = 0; ///< that it moves itself, in all skins
    std::size_t below = 0;    ///< how many joints are above it
};

/// Parents before their children. Throws std::runtime_error, naming the plug. Thread: main.
std::vector<JointReport> describeJoints();

/// A line a joint, indented below its parent.
std::string jointsText(const std::vector<JointReport>& joints);
/// As a member "joints" of the object that is open; angles in degrees.
void writeJoints(JsonWriter& json, const std::vector<JointReport>& joints);

} // namespace quarn
