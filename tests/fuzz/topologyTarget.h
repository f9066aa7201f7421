// SPDX-License-Identifier: Apache-2.0
// What the fuzz target of the geometry library does with one input. Apart from the target, so that a unit test can run
// the seed corpus through the same code.
#pragma once

#include "quill/IndexMapper.h"
#include "quill/MeshTopology.h"
#include "quill/val3.h"

#include <cstddef>
#include <cstdint>
#include <vector>

struct TopologyUse {
    std::size_t rings = 0; ///< further ones, and passes over normals
    bool self = true, masked = false, invert = false;
    std::vector<std::uint32_t> subset;
    std::vector<quill::val3<float>> points; ///< of the affected vertices
    float exponent = 1.0F, offset = 0.0F, step = 1.0F;
};

/// Builds adjacency and frames and runs everything that runs on those. Ends the process (abort) when a table holds an
/// index out of its range. Returns true when there was at least one edge and one frame to build.
bool useTopology(const quill::MeshTopology& topology, const quill::IndexMapper& map, const TopologyUse& use);

/// useTopology() of a topology, an index map and settings that are read from `size` bytes, none of them checked.
bool fuzzTopology(const std::uint8_t* data, std::size_t size);
