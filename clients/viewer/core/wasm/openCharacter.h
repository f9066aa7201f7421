// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "viewer/Character.h"

namespace viewer {

/// The character of the page; null, and the reason is kept for nw_error(), before one is open.
Character* openCharacter();

} // namespace viewer
