// SPDX-License-Identifier: Apache-2.0
// What the model tests share.
#pragma once

#include <filesystem>
#include <fstream>
#include <string>
#include <string_view>
#include <vector>

#include <gtest/gtest.h>

#include "nw_model/ModelMetadata.h"
#include "nw_model/PrincipalShapes.h"
#include "support/StdoutCapture.h"
#include "support/TemporaryFolder.h"

/// A temporary folder that files are written into.
class TestFolder : public TemporaryFolder {
public:
    std::filesystem::path operator/(const std::filesystem::path& name) const { return path() / name; }

    /// Writes a file in the folder and returns its path.
    std::filesystem::path write(const std::filesystem::path& name, std::string_view bytes) const {
        std::ofstream(path() / name, std::ios::binary) << bytes;
        return path() / name;
    }
};

/// A network file of tests/models, by its name without extension.
inline std::filesystem::path testModel(const std::string& name) {
    return std::filesystem::path(NW_TEST_MODELS) / (name + ".onnx");
}

/// Both readers must fail on `path` with `output`, and leave their outputs as their headers say.
inline void expectRefused(const std::filesystem::path& path, const std::string& output) {
    neuralWarp::ModelMetadata record{true,   11,        12, 13, 14, 15, {16}, neuralWarp::SubsetState::Partial,
                                     "tags", "geometry"};
    std::vector<float> values(3);
    std::uint64_t shapeCount = 9;
    std::uint64_t vertCount = 9;
    StdoutCapture out;
    EXPECT_FALSE(neuralWarp::readMetadataFile(record, path)) << path;
    EXPECT_FALSE(neuralWarp::readPrincipalShapesFile(path, values, shapeCount, vertCount)) << path;
    EXPECT_EQ(out.take(), output + output) << path;
    EXPECT_TRUE(record.loaded) << path;
    EXPECT_EQ(record.deltaMode + record.affectMap.size(), 13u) << path;
    EXPECT_EQ(record.geometry, "geometry") << path;
    EXPECT_TRUE(values.empty()) << path;
    EXPECT_EQ(shapeCount + vertCount, 0u) << path;
}

/// Whether both readers accept the file; they must then be silent.
inline void expectAccepted(const std::filesystem::path& path) {
    neuralWarp::ModelMetadata record;
    std::vector<float> values;
    std::uint64_t counts[2];
    StdoutCapture out;
    EXPECT_TRUE(neuralWarp::readMetadataFile(record, path));
    EXPECT_TRUE(neuralWarp::readPrincipalShapesFile(path, values, counts[0], counts[1]));
    EXPECT_EQ(out.take(), "");
}
