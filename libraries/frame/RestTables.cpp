// SPDX-License-Identifier: Apache-2.0
#include "frame/RestTables.h"

#include <utility>

namespace neuralWarp {

void buildConnections(quill::VertexConnections& connections, quill::SharedArray<float>& weights,
                      const quill::MeshTopology& topology, const quill::IndexMapper& map, const Points& restPoints) {
    connections.build(topology, map, 0, false);
    std::vector<float> fresh;
    connections.calculateConnectionWeights(fresh, restPoints, 1.0, 0.0);
    weights = std::move(fresh);
}

RestTables::RestTables(const quill::MeshTopology& topology, const Points& restPoints, const DeltaSettings& settings,
                       const quill::WorkWatch& watch)
    : points(restPoints) {
    map.setIdentity(restPoints.size());
    if (settings.isSmoothed())
        buildConnections(connections, connectionWeights, topology, map, restPoints);
    if (!settings.isSurface())
        return;
    frames.build(topology, map, &restPoints, watch);
    Points smoothed = restPoints;
    smoothPoints(smoothed, surface(), settings.smoothingIterations, watch.isCancelled);
    std::vector<quill::mat4d> inverse;
    frames.calculateFrames(inverse, smoothed, map, true, nullptr);
    smoothedFramesInverse = std::move(inverse);
}

} // namespace neuralWarp
