// SPDX-License-Identifier: Apache-2.0
// Lists of numbers as a scene has them: not trusted. [any]
#pragma once

#include "openquarn/HStatus.h"

#include <cstdint>
#include <limits>
#include <string>
#include <vector>

namespace rig {

/// The largest number that is an index.
constexpr double largestIndex = std::numeric_limits<std::uint32_t>::max();

/// A failure with that text.
HStatus wrong(const std::string& what);
/// Whether the value is a whole number from 0 to largestIndex; then it fits a std::uint32_t.
bool isIndex(double value);
/// Fails, naming list, position and value, for the first that is no index.
HStatus checkIndices(const char* list, const std::vector<double>& values);
/// The same for the first that is infinite or no number.
HStatus checkFinite(const char* list, const std::vector<double>& values);

} // namespace rig
