// SPDX-License-Identifier: Apache-2.0
// The files of a model directory beside its network, and what the deformer takes from them without a word.
#pragma once

#include "nw_model/ModelCertificate.h"
#include "nw_model/ModelMetadata.h"
#include "nw_model/TrainedPoses.h"

#include <cstdint>
#include <filesystem>
#include <optional>
#include <string>
#include <vector>

namespace quarn {

/// Reads metadata.json of a model directory. Adds a sentence to `problems` for everything that keeps the model from
/// doing what it was trained for; the record stays as it is when the file cannot be read. Libraries print on standard
/// output meanwhile. Thread: any, with a directory of its own.
void readMetadata(const std::filesystem::path& directory, neuralWarp::ModelMetadata& metadata,
                  std::vector<std::string>& problems);

struct ShapeSizes {
    bool hasFile = false;
    std::uint64_t count = 0;    ///< shapes
    std::uint64_t vertices = 0; ///< of each
    std::string source;         ///< the name of the file that the numbers are read from; empty for none
    std::string whyNotArchive;  ///< principal_shapes.npz is there and of no use: the reason
};

/// The same of principal_shapes.json and what stands for it, neither of which need be there.
ShapeSizes readShapeSizes(const std::filesystem::path& directory, std::vector<std::string>& problems);

/// What a model says of itself, and of the poses that it was trained on.
struct ModelKnowledge {
    std::optional<neuralWarp::ModelCertificate> certificate;
    neuralWarp::TrainedPoses poses; ///< none where there are none, or they cannot be used
    std::string why;                ///< what is missing and why, a sentence; empty where nothing is
};

/// Reads it. What is damaged is as good as missing, and said: the deformer does not need it. Thread: any, with a
/// directory of its own.
ModelKnowledge readKnowledge(const std::filesystem::path& directory);

} // namespace quarn
