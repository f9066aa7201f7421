// SPDX-License-Identifier: Apache-2.0
// Sums of the rows of a data set, by which a part of one is held against the next.
#pragma once

#include "quarn/dataset/DatasetWriter.h"

#include <filesystem>
#include <span>
#include <string>

namespace quarn {

/// As a PartRecord has it: of the row's frame, controls, deltas and distances of the skin, as the files have them.
std::string rowSum(int frame, std::span<const float> controls, std::span<const float> deltas,
                   std::span<const float> skin);

/// Of the first row in a folder with the arrays of `shape`, which has one. Throws storage::FileError.
std::string firstRowSum(const std::filesystem::path& folder, const DatasetShape& shape);

} // namespace quarn
