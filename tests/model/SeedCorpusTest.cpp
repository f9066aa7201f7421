// SPDX-License-Identifier: Apache-2.0
// The seeds of the fuzz targets do what their names say: a corpus of refused inputs alone would fuzz little.
#include <filesystem>
#include <fstream>
#include <iterator>
#include <string>

#include <gtest/gtest.h>

#include "fuzz/modelTargets.h"
#include "support/StdoutCapture.h"

namespace {

using Target = bool (*)(const std::uint8_t*, std::size_t);

std::string readBytes(const std::filesystem::path& path) {
    std::ifstream file(path, std::ios::binary);
    return {std::istreambuf_iterator<char>(file), {}};
}

/// Number of accepted seeds.
int runCorpus(const std::string& name, Target target) {
    int accepted = 0;
    for (const auto& entry : std::filesystem::directory_iterator(std::filesystem::path(NW_FUZZ_CORPUS) / name)) {
        const std::string bytes = readBytes(entry.path());
        const bool expected = entry.path().filename().string().rfind("accepted_", 0) == 0;
        StdoutCapture noise;
        EXPECT_EQ(target(reinterpret_cast<const std::uint8_t*>(bytes.data()), bytes.size()), expected) << entry.path();
        accepted += expected ? 1 : 0;
    }
    return accepted;
}

} // namespace

TEST(SeedCorpus, SeedsAreAcceptedOrRefusedAsNamed) {
    EXPECT_GE(runCorpus("fuzz_metadata", fuzzMetadata), 1);
    EXPECT_GE(runCorpus("fuzz_principal_shapes", fuzzPrincipalShapes), 1);
    EXPECT_GE(runCorpus("fuzz_onnx_load", fuzzOnnxLoad), 1);
}
