// SPDX-License-Identifier: Apache-2.0
// A NumPy array that grows on the disk, row by row, and can be taken up again after the program has died. It is written
// in its place: its folder is one that nobody reads before it is published.
#pragma once

#include "storage/ByteSum.h"
#include "storage/Descriptor.h"

#include <cstdint>
#include <filesystem>
#include <memory>
#include <span>
#include <string>
#include <vector>

namespace storage {

/// What the array is when it is complete: shape[0] rows, in C order.
struct ArrayLayout {
    std::string type;                 ///< of its numbers, "<f4" or "<i4": 4 bytes each
    std::vector<std::uint64_t> shape; ///< one to three dimensions

    std::uint64_t rowBytes() const;
};

/// Errors are FileError. Thread: one at a time.
class NpyRows {
public:
    NpyRows(std::filesystem::path path, ArrayLayout layout);

    /// An array without rows, whose header says how many there are going to be. What was at the path is replaced.
    void begin();
    /// Takes up the file with its first `rows` rows, when `sum` is their sum(); what comes after them is cut off. False
    /// when the file is not there, too short, longer than the complete array, or other bytes; it is then as it was.
    bool resume(std::uint64_t rows, const std::string& sum);
    /// `row` rowBytes() bytes. After an error only destruction is left.
    void append(std::span<const std::byte> row);
    /// Bytes of a row that was appended, or taken up. Throws FileError when it cannot be read.
    void read(std::uint64_t row, std::span<std::byte> bytes) const;
    /// Brings the rows to the disk.
    void sync();
    /// Brings the array, which is complete, to the disk and into the place of `file`, on the same file system; one that
    /// is there is replaced, and its permissions stay. Only destruction is left then.
    void publish(const std::filesystem::path& file);
    /// Of the header and all rows appended.
    std::string sum() const { return sum_->digits(); }

private:
    void cut(std::uint64_t rows);
    bool hasSum(std::uint64_t bytes, const std::string& sum);

    std::filesystem::path path_;
    ArrayLayout layout_;
    Descriptor file_;
    std::unique_ptr<ByteSum> sum_; ///< from begin() or resume() on
};

} // namespace storage
