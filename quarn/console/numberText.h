// SPDX-License-Identifier: Apache-2.0
// Numbers in sentences.
#pragma once

#include <string>

namespace quarn {

/// As a person reads it, in six digits, whatever the user's locale. Thread: any.
std::string numberText(double value);
/// The same in three digits, for what is measured or estimated. Thread: any.
std::string roughText(double value);

} // namespace quarn
