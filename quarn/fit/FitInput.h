// SPDX-License-Identifier: Apache-2.0
// What is compared: a mesh as its rig poses it, and frames that are to be its targets.
#pragma once

#include <cstddef>
#include <functional>
#include <vector>

namespace quarn {

/// Frames count from 0; points are x, y, z of each vertex in the scene's unit and the mesh's object space. The reading
/// functions fill `xyz` with 3 * vertices numbers; what they throw comes out of whatever called them.
struct FitInput {
    using Read = std::function<void(std::size_t frame, std::vector<double>& xyz)>;

    std::size_t vertices = 0; ///< of both, above 0
    double diagonal = 0.0;    ///< of the whole mesh's box at rest
    std::vector<double> rest; ///< 3 * vertices: the mesh at rest
    Read skin;                ///< of frames from `first` to `last`
    Read cache;               ///< of frames below `frames`
    std::size_t frames = 0;   ///< of the cache, above 0
    std::size_t first = 0;    ///< of the frames that the skin is looked at in
    std::size_t last = 0;     ///< below `frames`
    std::size_t reach = 0;    ///< by how many frames the cache may be early or late
};

} // namespace quarn
