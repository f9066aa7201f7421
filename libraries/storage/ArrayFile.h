// SPDX-License-Identifier: Apache-2.0
// A NumPy array of any size in a file, whose rows are read one by one, or copied into another file.
#pragma once

#include "storage/Descriptor.h"
#include "storage/FileBytes.h"
#include "storage/npyHeader.h"

#include <cstddef>
#include <cstdint>
#include <filesystem>
#include <functional>
#include <span>
#include <vector>

namespace storage {

/// An array of '<f4', '<f8' or '<i4' in C order, open: all its numbers were there, and nothing behind them. Errors are
/// FileError, naming the path. Thread: any, one at a time.
class ArrayFile {
public:
    explicit ArrayFile(const std::filesystem::path& path);

    const NpyArray& array() const { return array_; }
    std::uint64_t rows() const { return array_.shape.front(); }
    std::uint64_t rowBytes() const { return rowBytes_; } ///< may be 0

    /// All its numbers, one row after the other, for as long as this lives.
    FileBytes numbers() const { return {file_.number(), start_, rows() * rowBytes_}; }
    /// Fills `bytes` with what stands from row `first` on, which must be in the array: std::out_of_range otherwise.
    void read(std::uint64_t first, std::span<std::byte> bytes) const;

private:
    void load(std::uint64_t size);

    std::filesystem::path path_;
    Descriptor file_;
    NpyArray array_;
    std::uint64_t start_ = 0; ///< byte of the file where the numbers begin
    std::uint64_t rowBytes_ = 0;
};

/// Writes the file `path`, the array of `shape` whose rows are those of `pieces`, one after the other, and brings it to
/// the disk. What was in a file there is gone. `pieces` at least one, all of the same type; their numbers
/// are as many as `shape` says. By the system's own copying where it can, in blocks otherwise. `copied` is told
/// of bytes as they come, a block at a time; what it throws ends it. Throws FileError for a piece that is not what it
/// was, for a full disk, and for a link at `path`.
void joinArrays(const std::filesystem::path& path, const std::vector<std::filesystem::path>& pieces,
                const std::vector<std::uint64_t>& shape, const std::function<void(std::uint64_t bytes)>& copied);

} // namespace storage
