// SPDX-License-Identifier: Apache-2.0
// Words of error messages.
#pragma once

#include <cstddef>
#include <string>

namespace rig {

/// In the fewest digits that read back the same.
std::string text(double value);
/// "name[index]".
std::string element(const char* name, std::size_t index);

} // namespace rig
