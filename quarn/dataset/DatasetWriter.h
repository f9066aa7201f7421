// SPDX-License-Identifier: Apache-2.0
// The arrays of a training data set while they are being made.
#pragma once

#include "quarn/scene/RecordedRows.h"

#include <cstddef>
#include <cstdint>
#include <span>

namespace quarn {

/// How large a data set is.
struct DatasetShape {
    std::size_t rows = 0;
    std::size_t controls = 0; ///< numbers a row
    std::size_t deltas = 0;   ///< vertices a row: 3 numbers each, and a distance of the skin

    std::uint64_t rowBytes() const { return 4 + 4 * std::uint64_t{controls} + 16 * std::uint64_t{deltas}; }
    std::uint64_t bytes() const { return rows * rowBytes(); }
};

/// Names of the files in the folder of a data set.
namespace datasetFile {
inline constexpr const char* controls = "controls.npy";
inline constexpr const char* deltas = "deltas.npy";
inline constexpr const char* frames = "frames.npy";
inline constexpr const char* skin = "skin.npy";
inline constexpr const char* progress = RecordedRows::progressFile;
} // namespace datasetFile

/// controls.npy, deltas.npy, frames.npy and skin.npy. Thread: one at a time.
class DatasetWriter : public RecordedRows {
public:
    DatasetWriter(const std::filesystem::path& folder, const DatasetShape& shape);

    /// A row; `controls` shape.controls, `deltas` 3 * shape.deltas and `skin` shape.deltas numbers.
    void append(int frame, std::span<const float> controls, std::span<const float> deltas, std::span<const float> skin);

private:
    DatasetShape shape_;
};

} // namespace quarn
