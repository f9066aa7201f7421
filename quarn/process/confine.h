// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "quarn/process/runApart.h"

namespace quarn {

/// Takes from this process, for good, what a process that only computes does not need: a voice, core files, writing,
/// and time and memory beyond the limits. What the kernel does not have is left out. Allocates nothing.
void confine(const ApartLimits& limits);

} // namespace quarn
