// SPDX-License-Identifier: Apache-2.0
// NumPy arrays that get a row at a time, and the record of how far they are.
#pragma once

#include "storage/NpyRows.h"

#include <chrono>
#include <cstddef>
#include <filesystem>
#include <span>
#include <string>
#include <vector>

namespace quarn {

/// Writes arrays into a folder that exists. Every now and then the rows are brought to the disk, and then progress.json
/// says how many they are and what their bytes add up to: whatever happens to the program or the machine, these rows
/// can be taken up again. Holds no row in memory. Errors are std::runtime_error with the sentence for the user. Thread:
/// one at a time.
class RecordedRows {
public:
    struct Array {
        std::string file;            ///< its name in the folder
        storage::ArrayLayout layout; ///< all have as many rows
    };
    RecordedRows(const std::filesystem::path& folder, const std::vector<Array>& arrays);

    /// Begins without rows.
    void begin();
    /// Takes up the recorded rows. Answers why it could not; empty when it did.
    std::string resume();
    /// A row of each array, in their order.
    void append(std::initializer_list<std::span<const std::byte>> row);
    /// Brings all rows to the disk and records them. After a failed append() it does nothing: rows of before that were
    /// not saved are lost.
    void save();
    /// The bytes of a row of an array. Throws storage::FileError.
    void read(std::size_t array, std::size_t row, std::span<std::byte> bytes) const { arrays_[array].read(row, bytes); }

    /// Puts an array, which has all its rows, into the place of `file`, as NpyRows::publish() does.
    void publish(std::size_t array, const std::filesystem::path& file) { arrays_[array].publish(file); }

    std::size_t allRows() const { return allRows_; }
    std::size_t rows() const { return rows_; }
    /// Of rows(), those that are on the disk for certain.
    std::size_t savedRows() const { return savedRows_; }

    static constexpr const char* progressFile = "progress.json";

private:
    bool isTimeToSave() const;
    /// `begin`: of what it takes to save, for isTimeToSave().
    void record(std::chrono::steady_clock::time_point begin);

    std::filesystem::path progress_;
    std::vector<std::string> files_;
    std::vector<storage::NpyRows> arrays_;
    std::size_t allRows_;
    bool isOpen_ = false;
    std::size_t rows_ = 0;
    std::size_t savedRows_ = 0;
    std::chrono::steady_clock::time_point saved_;
    std::chrono::steady_clock::duration saveTook_{0};
};

} // namespace quarn
