// SPDX-License-Identifier: Apache-2.0
#include "fuzz/scriptTarget.h"
#include "support/seedCorpus.h"

TEST(ScriptSeeds, AreAcceptedOrRefusedAsNamed) {
    EXPECT_GE(runSeedCorpus("fuzz_script", fuzzScript), 2);
}
