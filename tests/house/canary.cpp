// SPDX-License-Identifier: Apache-2.0
// A test that must fail (CTest inverts it) and its twin that must pass.
#include <gtest/gtest.h>

TEST(Canary, MustFail) {
    EXPECT_EQ(1, 2) << "this failure is planted";
}

TEST(Canary, MustPass) {
    EXPECT_EQ(1, 1);
}
