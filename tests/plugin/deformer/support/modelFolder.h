// SPDX-License-Identifier: Apache-2.0
// Model directories, made for the occasion.
#pragma once

#include <cstdint>
#include <filesystem>
#include <string>
#include <vector>

/// What a model directory says. The network computes outputs = values * weights + bias, where the values are the
/// controls, or what the hidden layers made of them.
struct ModelSpec {
    std::size_t controls = 1;
    /// How wide each hidden layer is, which computes max(values * w + 0, 0) with some small w of its own.
    std::vector<std::size_t> hidden = {};
    std::vector<float> bias{1.0F}; ///< as many as there are outputs
    std::vector<float> weights;    ///< [values][outputs]; empty: all 0, so that the outputs are the bias
    /// Principal shapes, each 3 values per slot; none: no file of shapes, the outputs are the deltas themselves.
    std::vector<std::vector<float>> shapes;

    std::uint32_t deltaMode = 1;
    std::uint32_t smoothingIterations = 0;
    std::uint32_t fullCount = 0;
    std::uint32_t affectCount = 0;
    std::string subsetState = "complete";
    std::vector<std::uint32_t> affectMap; ///< for "partial"
    std::string componentTagExpression = "*";

    std::string options; ///< what the network's metadata hold as "ort_config"; empty: no such entry
};

/// Writes metadata, network and shapes into the folder, which is made when it is missing; files of before are replaced,
/// and a file of shapes that is not wanted is removed. Throws std::runtime_error.
void writeModel(const std::filesystem::path& directory, const ModelSpec& spec);

/// The bytes of the network alone, an ONNX file.
std::string networkBytes(const ModelSpec& spec);

/// Writes a file. Throws std::runtime_error.
void writeFile(const std::filesystem::path& path, const std::string& bytes);
