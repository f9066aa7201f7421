// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "Case.h"

#include <string>
#include <vector>

namespace replay {

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
