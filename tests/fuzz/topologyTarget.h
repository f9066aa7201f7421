// SPDX-License-Identifier: Apache-2.0
// What the fuzz target of the geometry library does with one input. Apart from the target, so that a unit test can run
// the seed corpus through the same code.
#pragma once

#include <cstddef>
#include <cstdint>

/// Reads a topology, an index map and settings from `size` bytes, none of them checked, builds adjacency and frames
/// from them and runs everything that runs on those. Ends the process (abort) when a table holds an index out of its
/// range. Returns true when there was at least one edge and one frame to build.
bool fuzzTopology(const std::uint8_t* data, std::size_t size);
