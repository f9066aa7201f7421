// SPDX-License-Identifier: Apache-2.0
// Doing something that may crash, to find out whether it does.
#pragma once

#include <functional>

namespace quarn {

/// Runs `action` in a copy of this process, which prints nothing and changes nothing here. Returns when it ends,
/// whether it returns or throws. Throws std::runtime_error with the reason when it crashes or takes more than two
/// minutes of processor time, or when there can be no such process. `action` may only use what the calling thread uses
/// alone.
void runTrial(const std::function<void()>& action);

} // namespace quarn
