// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "quarn/console/json.h"
#include "quarn/dataset/DatasetWriter.h"

#include <filesystem>
#include <vector>

namespace quarn {

/// Between which two values a control is.
struct ControlRange {
    float least = 0;
    float largest = 0;
};

/// Of each control in a complete controls.npy that a DatasetWriter has written. Throws std::runtime_error.
std::vector<ControlRange> controlRanges(const std::filesystem::path& controls, const DatasetShape& shape);

/// As a list of pairs.
void writeRanges(JsonWriter& writer, const std::vector<ControlRange>& ranges);

} // namespace quarn
