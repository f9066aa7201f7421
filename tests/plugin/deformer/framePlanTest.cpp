// SPDX-License-Identifier: Apache-2.0
#include "deformer/framePlan.h"

#include <gtest/gtest.h>

namespace {

using neuralWarp::Attempt;

TEST(FramePlan, OfWhatIsOnAndHowFarTheMorphGoes) {
    constexpr double nearlyAll = 1.0 - 1e-16;
    struct Row {
        bool isActive, isMorphed;
        double morphWeight;
        Attempt attempt;
    };
    for (const Row& row : {Row{false, false, 0.0, Attempt::nothing},
                           {false, false, 1.0, Attempt::nothing}, // not in force, whatever its weight
                           {false, true, 0.25, Attempt::withoutModel},
                           {false, true, 1.0, Attempt::withoutModel},
                           {true, false, 0.0, Attempt::withModel},
                           {true, false, 1.0, Attempt::withModel},
                           {true, true, 0.25, Attempt::withModel},
                           {true, true, nearlyAll, Attempt::withModel},
                           {true, true, 1.0, Attempt::withoutModel},
                           {true, true, 1.5, Attempt::withModel},
                           {true, true, -1.0, Attempt::withModel}})
        EXPECT_EQ(neuralWarp::whatToAttempt(row.isActive, row.isMorphed, row.morphWeight), row.attempt)
            << row.isActive << row.isMorphed << ' ' << row.morphWeight;
}

} // namespace
