// SPDX-License-Identifier: Apache-2.0
// Numbers in sentences and legends.
#pragma once

#include <string>

namespace quarn {

/// As a person reads it, in six digits, whatever the user's locale. Thread: any.
std::string numberText(double value);
/// The same in three digits, for what is measured or estimated. Thread: any.
std::string roughText(double value);

/// The next of 1, 2 or 5 times a power of ten that is not below `value`, for where a scale ends; 1 for a value that is
/// not above 0. Thread: any.
double roundedUp(double value);

} // namespace quarn
