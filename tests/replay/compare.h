// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "Case.h"

#include <string>
#include <vector>

namespace replay {

// Of positions from an OpenCL device: single precision throughout, where the expected values were made with frames and
// a blend in double precision. A device that is a CPU is within 3e-7; GPUs divide and take roots less exactly.
inline constexpr double onDeviceTolerance = 5e-6;

// One value in which the actual result differs from the expected one.
struct Disagreement {
    std::string where; // "transport[3][1]"
    std::string expected;
    std::string actual;
};

// Compares two trees of values. Integers, booleans and texts agree exactly; other numbers when
// |actual - expected| <= tolerance * max(1, |expected|). A member or element that only one side has is a disagreement.
std::vector<Disagreement> compare(const Json& expected, const Json& actual, double tolerance);

} // namespace replay
