// SPDX-License-Identifier: Apache-2.0
// The head of a NumPy array file that holds points: its first bytes, and the Python dictionary that follows them.
//
// Source: the NPY format, versions 1.0 to 3.0, as NumPy's documentation of numpy.lib.format describes it. A file begins
// with "\x93NUMPY", two bytes of version, the length of the header (two bytes, little-endian; four from version 2.0 on)
// and the header: a dictionary with the keys 'descr', 'fortran_order' and 'shape', padded with spaces, "\n" at its end.
#pragma once

#include <cstddef>
#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

namespace storage {

/// What the array is: [frames, vertices, 3] numbers in C order.
struct NpyHeader {
    std::size_t scalarSize = 4;  ///< bytes of a number: 4 ('<f4') or 8 ('<f8')
    std::uint64_t frames = 1;    ///< as the header says: not checked against anything
    std::uint64_t vertices = 0;  ///< of one frame; the same
    std::uint64_t dataStart = 0; ///< byte of the file where the numbers begin
};

/// What the header of any array says; none of it is checked against anything.
struct NpyArray {
    std::string descr; ///< such as "<f4"
    std::vector<std::uint64_t> shape;
};

/// So many bytes of a file tell where its header is.
constexpr std::size_t npyPreambleSize = 12;
/// Longer headers are refused; that of a point cache takes about 80 bytes.
constexpr std::size_t npyMaxHeaderLength = 65536;

/// Where a file's header is.
struct NpyPlace {
    std::size_t start = 0;
    std::size_t length = 0; ///< at most npyMaxHeaderLength
};

/// `bytes` the first npyPreambleSize bytes of the file, or all that it has. Throws std::runtime_error, with the reason
/// alone, when these are not the first bytes of a file that is read here. [any]
NpyPlace findNpyHeader(std::string_view bytes);

/// Reads the header's text, of any array in C order whose elements are plain. Throws std::runtime_error, with the
/// reason alone, for anything but the three keys. [any]
NpyArray parseNpyArray(std::string_view text);
/// Throws the same unless `size` bytes are those of all numbers, of `numberSize` bytes each. [any]
void requireNpySize(const NpyArray& array, std::size_t numberSize, std::uint64_t size);
/// "[2, 3]"; of more than five numbers the first five. [any]
std::string npyShapeText(const std::vector<std::uint64_t>& shape);

/// Reads the header's text; `dataStart` stays 0. A shape [vertices, 3] is one frame. Throws std::runtime_error, with
/// the reason alone, for anything but the three keys with values that are read here. [any]
NpyHeader parseNpyHeader(std::string_view text);

/// Size of what makeNpyHead() gives: room for any shape, and a multiple of 64, which keeps the numbers aligned.
constexpr std::size_t npyHeadSize = 128;

/// All bytes before the numbers of a file of version 1.0. `shape` at most 3 numbers. [any]
std::string makeNpyHead(std::string_view descr, const std::vector<std::uint64_t>& shape);
/// The same of [frames, vertices, 3] '<f4'. [any]
std::string makeNpyHead(std::uint64_t frames, std::uint64_t vertices);

} // namespace storage
