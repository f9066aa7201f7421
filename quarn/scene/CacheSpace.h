// SPDX-License-Identifier: Apache-2.0
// The space of point caches that another tool made, or is to read.
#pragma once

#include <span>
#include <string>

namespace CLI {
class App;
}

namespace quarn {

/// How positions of a cache are those of the scene, whose y is up. By default they are the same, to the bit.
struct CacheSpace {
    std::string axes = "y"; ///< the cache's axis that is up: "y", or "z" with -y where the scene has z
    double scale = 1.0;     ///< units of the scene a unit of the cache; finite, above 0

    bool isTheScenes() const { return axes != "z" && scale == 1.0; }
    /// Turns and scales x, y, z of each point, from the cache's space into the scene's. Thread: any.
    void toScene(std::span<double> xyz) const;
    /// The reverse. Throws std::runtime_error, naming the vertex, where a coordinate becomes too large. Thread: any.
    void toCache(std::span<float> xyz) const;
};

/// Adds --axes and --scale. `space` must outlive `command`.
void addCacheSpaceOptions(CLI::App& command, CacheSpace& space);

} // namespace quarn
