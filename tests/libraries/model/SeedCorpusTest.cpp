// SPDX-License-Identifier: Apache-2.0
#include <gtest/gtest.h>

#include "fuzz/modelTargets.h"
#include "support/StdoutCapture.h"
#include "support/seedCorpus.h"

TEST(SeedCorpus, SeedsAreAcceptedOrRefusedAsNamed) {
    StdoutCapture noise; // refused seeds print their lines
    EXPECT_GE(runSeedCorpus("fuzz_metadata", fuzzMetadata), 1);
    EXPECT_GE(runSeedCorpus("fuzz_principal_shapes", fuzzPrincipalShapes), 1);
    EXPECT_GE(runSeedCorpus("fuzz_shapes_archive", fuzzShapesArchive), 1);
    EXPECT_GE(runSeedCorpus("fuzz_onnx_load", fuzzOnnxLoad), 1);
}
