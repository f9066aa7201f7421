// SPDX-License-Identifier: Apache-2.0
#include "nw_deform/surface.h"

#include "frame/RestTables.h"

namespace neuralWarp {

void smoothOnRest(Points& points, const quill::MeshTopology& topology, const Points& rest, std::int64_t passes,
                  const IsCancelled& isCancelled) {
    const RestTables tables(topology, rest, {.smoothingIterations = passes, .deltaMode = kOffsetMode});
    smoothPoints(points, tables.surface(), passes, isCancelled);
}

std::vector<quill::mat4d> framesOnRest(const Points& points, const quill::MeshTopology& topology, const Points& rest,
                                       const quill::WorkWatch& watch) {
    quill::IndexMapper map;
    map.setIdentity(rest.size());
    quill::VertexFrames pairs;
    pairs.build(topology, map, &rest, watch);
    std::vector<quill::mat4d> frames;
    pairs.calculateFrames(frames, points, map, false, nullptr);
    return frames;
}

} // namespace neuralWarp
