// SPDX-License-Identifier: Apache-2.0
// What sweeps share: chance, scripts, and a comparison of bits.
#pragma once

#include "openquarn/HPointArray.h"
#include "openquarn_app/Commands.h"
#include "plugin/Dice.h"

#include <gtest/gtest.h>

#include <cstring>
#include <string>

/// The first point at which two arrays differ by a bit (all NaN count as one); the length when there is none, or when
/// they differ in length.
inline unsigned firstDifference(const HPointArray& a, const HPointArray& b) {
    const auto same = [](double x, double y) { return std::memcmp(&x, &y, sizeof x) == 0 || (x != x && y != y); };
    unsigned i = 0;
    while (i < a.length() && i < b.length() && same(a[i].x, b[i].x) && same(a[i].y, b[i].y) && same(a[i].z, b[i].z) &&
           same(a[i].w, b[i].w))
        ++i;
    return i;
}

/// Runs commands, none of which may fail, and gives the result of the last.
inline OpenQuarn::CommandValue script(const std::string& text) {
    const OpenQuarn::CommandOutcome outcome = OpenQuarn::runCommand(text);
    EXPECT_TRUE(outcome) << outcome.error;
    return outcome.result;
}
