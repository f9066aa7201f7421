// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "viewer/Blocks.h"

#include <cstddef>
#include <cstdint>

namespace viewer {

/// The block "settings": how many there are of everything. What a count is of is refused where it has another size, so
/// that nothing is allocated by a number alone.
struct Settings {
    std::size_t vertices = 0;
    std::uint32_t deltaMode = 0; ///< one that applies deltas
    std::uint32_t smoothingIterations = 0;
    std::size_t shapes = 0; ///< principal shapes; 0: the network gives deltas
    std::size_t slots = 0;
    std::size_t controls = 0;
    std::size_t frames = 0;
    bool takesPoints = false; ///< frames have points, and no skin
    std::size_t matrices = 0; ///< of the skin
    std::size_t joints = 0;
    std::size_t sliders = 0;
    std::size_t blendShapes = 0;
    std::size_t freeValues = 0;
    std::size_t converters = 0;

    bool hasRig() const { return sliders != 0; }
};

/// Throws std::runtime_error for settings that are none.
Settings readSettings(const Blocks& blocks);

} // namespace viewer
