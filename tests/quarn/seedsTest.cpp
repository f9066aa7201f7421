// SPDX-License-Identifier: Apache-2.0
// The seeds of the fuzz targets of quarn, and of the words and scenes of the host with the deformer's and the rig's
// nodes.
#include "fuzz/characterTargets.h"
#include "fuzz/fileTargets.h"
#include "fuzz/rigSceneTarget.h"
#include "fuzz/wordsTarget.h"
#include "support/seedCorpus.h"

TEST(QuarnSeeds, AreAcceptedOrRefusedAsTheirNamesSay) {
    EXPECT_GE(runSeedCorpus("fuzz_gltf", fuzzGltf), 3);
    EXPECT_GE(runSeedCorpus("fuzz_character_answer", fuzzCharacterAnswer), 1);
    EXPECT_GE(runSeedCorpus("fuzz_control_meshes", fuzzControlMeshes), 3);
    EXPECT_GE(runSeedCorpus("fuzz_npy_table", fuzzNpyTable), 3);
    EXPECT_GE(runSeedCorpus("fuzz_side_json", fuzzSideJson), 4);
    EXPECT_GE(runSeedCorpus("fuzz_words", fuzzWords), 2);
    EXPECT_GE(runSeedCorpus("fuzz_scene", fuzzRigScene), 5);
}
