// SPDX-License-Identifier: Apache-2.0
// Variables of the environment that are for this process alone.
#pragma once

#include <string>

namespace quarn {

/// Sets a variable, unless it is there already: what the user has set stays. Programs that runProgram() starts do not
/// get what was set here; a copy of this process, of runApart(), has it. Throws std::system_error. Thread: main, before
/// there is another.
void setOwnVariable(const std::string& name, const std::string& value);

/// Whether the variable was set here. Thread: any, once main has set them.
bool isOwnVariable(const std::string& name);

} // namespace quarn
