// SPDX-License-Identifier: Apache-2.0
// Doing something that may crash where its crash does no harm.
#pragma once

#include <functional>
#include <string>

namespace quarn {

/// Runs `action` in a copy of this process, which prints nothing and changes nothing here, and gives what it returns.
/// Throws std::runtime_error with what it throws, or std::bad_alloc when that is it; and with the reason when it
/// crashes or takes more than two minutes of processor time, or when there can be no such process. `action` may only
/// use what the calling thread uses alone.
std::string runTrial(const std::function<std::string()>& action);

} // namespace quarn
