// SPDX-License-Identifier: Apache-2.0
// The frames of a point cache as the scene has its points.
#pragma once

#include "quarn/fit/CacheChange.h"
#include "quarn/scene/CacheSpace.h"
#include "storage/PointCache.h"

#include <cstddef>
#include <cstdint>
#include <memory>
#include <utility>
#include <vector>

namespace quarn {

/// Reads frames of a cache in the scene's space, unit and order of vertices, whatever those of the file are. Memory
/// does not grow with frames. Errors are those of storage::PointCache. Thread: one at a time.
class SceneFrames {
public:
    SceneFrames(std::unique_ptr<storage::PointCache> cache, CacheSpace space);

    /// From now on vertex v of the cache is vertex sceneVertexOf[v] of the scene; of several that are one, the first is
    /// taken. The map must fit: see requireFit().
    void reorder(std::vector<std::int32_t> sceneVertexOf, std::size_t sceneVertices);

    /// From now on frames are changed, after all else, by all of this but its shift, which is a matter of when they are
    /// played. The order is empty, or as long as vertexCount().
    void change(CacheChange change) { change_ = std::move(change); }

    const storage::PointCache& cache() const { return *cache_; }
    std::size_t frameCount() const { return cache_->frameCount(); }
    std::size_t vertexCount() const; ///< of a frame that is read
    /// Whether what is read is what the file has, and a scene can play that: it plays no texts.
    bool areTheFiles() const {
        return cache_->format() != storage::CacheFormat::obj && sceneVertexOf_.empty() && space_.isTheScenes() &&
               change_.isInPlace() && change_.order.empty();
    }
    const CacheSpace& space() const { return space_; }

    /// `xyz` is resized to x, y, z of every vertex.
    void read(std::size_t frame, std::vector<double>& xyz);
    /// Of vertices of the cache that are one of the scene, from the first of them, in the scene's unit, over all frames
    /// that have been read; infinite when a position was no number.
    double largestDistance() const { return largest_; }

private:
    void readUnchanged(std::size_t frame, std::vector<double>& xyz);
    void takeFirsts(std::vector<double>& xyz) const;
    void measure(const std::vector<double>& xyz);

    std::unique_ptr<storage::PointCache> cache_;
    CacheSpace space_;
    std::vector<std::int32_t> sceneVertexOf_; ///< by vertex of the cache; empty: the same
    std::vector<std::size_t> first_;          ///< of each vertex of the scene, the first in the cache
    CacheChange change_;
    std::vector<double> filePoints_;
    double largest_ = 0.0;
};

} // namespace quarn
