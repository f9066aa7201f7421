// SPDX-License-Identifier: Apache-2.0
#include <gtest/gtest.h>

#include "fuzz/topologyTarget.h"
#include "support/seedCorpus.h"

TEST(TopologySeeds, SeedsAreAcceptedOrRefusedAsNamed) {
    EXPECT_GE(runSeedCorpus("fuzz_topology", fuzzTopology), 2);
}
