// SPDX-License-Identifier: Apache-2.0
// Small arrays in NumPy files, read and written as a whole. Large ones, of points, go through NpyFile and NpyRows.
#pragma once

#include <cstdint>
#include <filesystem>
#include <span>
#include <vector>

namespace storage {

/// Rows of numbers, one row after the other.
struct FloatTable {
    std::size_t rows = 0;
    std::size_t columns = 0;
    std::vector<float> values; ///< rows * columns
};

/// A file larger than this is refused.
inline constexpr std::uint64_t npyArrayFileLimit = std::uint64_t{1} << 32;

/// Reads an array [rows, columns] of '<f4' in C order. Throws std::runtime_error that names the path and what is wrong,
/// with the shape or the size that it has. Thread: any.
FloatTable readFloatTable(const std::filesystem::path& path);
/// The same of [count] '<i4'.
std::vector<std::int32_t> readIntegers(const std::filesystem::path& path);

/// Writes the file as a whole or not at all. `table.values` has rows * columns numbers. Throws std::runtime_error.
void writeFloatTable(const std::filesystem::path& path, const FloatTable& table);
void writeIntegers(const std::filesystem::path& path, std::span<const std::int32_t> values);

} // namespace storage
