// SPDX-License-Identifier: Apache-2.0
// The two JSON files of a model directory, and what the deformer takes from them without a word.
#pragma once

#include "nw_model/ModelMetadata.h"

#include <cstdint>
#include <filesystem>
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
};

/// The same of principal_shapes.json, which need not be there.
ShapeSizes readShapeSizes(const std::filesystem::path& directory, std::vector<std::string>& problems);

} // namespace quarn
