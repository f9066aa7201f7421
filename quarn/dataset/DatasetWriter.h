// SPDX-License-Identifier: Apache-2.0
// The arrays of a training data set while they are being made, and the record of how far they are.
#pragma once

#include "storage/NpyRows.h"

#include <array>
#include <chrono>
#include <cstddef>
#include <string>

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
inline constexpr const char* progress = "progress.json";
} // namespace datasetFile

/// Writes controls.npy, deltas.npy, frames.npy and skin.npy into a folder that exists. Every now and then the rows are
/// brought to the disk, and then progress.json says how many they are and what their bytes add up to: whatever happens
/// to the program or the machine, these rows can be taken up again. Holds no row in memory. Errors are
/// std::runtime_error with the sentence for the user. Thread: one at a time.
class DatasetWriter {
public:
    DatasetWriter(const std::filesystem::path& folder, const DatasetShape& shape);

    /// Begins without rows.
    void begin();
    /// Takes up the recorded rows. Answers why it could not; empty when it did.
    std::string resume();
    /// A row; `controls` shape.controls, `deltas` 3 * shape.deltas and `skin` shape.deltas numbers.
    void append(int frame, std::span<const float> controls, std::span<const float> deltas, std::span<const float> skin);
    /// Brings all rows to the disk and records them. After a failed append() it does nothing: rows of before that were
    /// not saved are lost.
    void save();

    std::size_t rows() const { return rows_; }
    /// Of rows(), those that are on the disk for certain.
    std::size_t savedRows() const { return savedRows_; }

private:
    std::filesystem::path progress_;
    DatasetShape shape_;
    storage::NpyRows controls_, deltas_, frames_, skin_;
    bool isOpen_ = false;
    std::size_t rows_ = 0;
    std::size_t savedRows_ = 0;
    std::chrono::steady_clock::time_point saved_;
};

} // namespace quarn
