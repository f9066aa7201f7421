// SPDX-License-Identifier: Apache-2.0
// What the fuzz targets of the small files beside a scene do with one input.
#pragma once

#include <cstddef>
#include <cstdint>

/// Reads the bytes after the first as an array in a NumPy file: of whole numbers after "i", else a table of floats.
/// Ends the process (abort) when a table that is accepted has another number of values than its shape says. True when
/// accepted.
bool fuzzNpyTable(const std::uint8_t* data, std::size_t size);

/// Reads the bytes after the first as one of the JSON files beside a scene: after "p" parents of joints, after "l"
/// their limits, after "k" keys of poses, else the description of a data set. Ends the process (abort) when what is
/// accepted is not as the readers promise, or an error does not name the file. True when accepted.
bool fuzzSideJson(const std::uint8_t* data, std::size_t size);
