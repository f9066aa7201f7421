// SPDX-License-Identifier: Apache-2.0
// What the user is told of a skeleton in several parts.
#pragma once

#include "quarn/character/Character.h"

namespace quarn {

/// A sentence without a full stop that names the roots; empty where there is one, or none.
std::string rootsWarning(const Character& character);

} // namespace quarn
