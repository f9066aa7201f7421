// SPDX-License-Identifier: Apache-2.0
// Poses as a BVH file: a skeleton of offsets, and angles in every frame.
#pragma once

#include "quarn/pose/FilePlaces.h"
#include "quarn/pose/Motion.h"

#include <iosfwd>

namespace quarn {

/// Positions in the scene's unit and angles in degrees, in the order zxy, of every joint: with them its matrix is what
/// the scene has. The rest pose's rotations are lost, since a skeleton of offsets has none: the offsets are those of
/// the rest pose in the parent's axes. The format numbers frames from the first line on, whatever theirs are. Throws
/// std::runtime_error, naming the joint, for a scale that is not 1, for several roots or none, and for a root that
/// something places. The stream must be in the classic locale. Thread: main.
void writeBvhPoses(std::ostream& out, const Motion& motion, const FilePlaces& places);

} // namespace quarn
