// SPDX-License-Identifier: Apache-2.0
// Giving joints another parent, for characters whose file has them side by side.
#pragma once

#include "quarn/character/Character.h"

#include <map>
#include <string>

namespace quarn {

/// From a joint to its new parent, by the names of the file.
using ParentMap = std::map<std::string, std::string>;

/// Hangs joints below others. Nothing moves at rest: a joint keeps where it is in the world, and its local rest
/// transform is made anew; what hangs below it comes along. Joints are put into order again, parents first, and all
/// indices with them. Animations get the tracks that keep the joints where they were in the world, with linear keys at
/// every frame of `framesPerSecond` (above 0) and wherever the animation has a key. Throws std::runtime_error, naming
/// the joint, when there is none of a name, when a joint would hang below itself, and when the new parent has a scale
/// of 0.
void reparent(Character& character, const ParentMap& parents, double framesPerSecond);

} // namespace quarn
