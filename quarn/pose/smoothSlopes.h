// SPDX-License-Identifier: Apache-2.0
// Slopes of a smooth curve through keys.
#pragma once

#include <vector>

namespace quarn {

/// The slope at each key, in values per unit of time, for cubic Hermite pieces that go through the keys without going
/// beyond them: flat at the first and the last key and wherever the direction changes, monotone between two keys.
/// `times` ascending, as many as `values`.
std::vector<double> smoothSlopes(const std::vector<double>& times, const std::vector<double>& values);

} // namespace quarn
