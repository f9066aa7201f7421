// SPDX-License-Identifier: Apache-2.0
// What is measured once on a mesh at rest, for all its frames.
#pragma once

#include "frame/FrameModel.h"
#include "frame/smoothing.h"
#include "quill/IndexMapper.h"
#include "quill/MeshTopology.h"
#include "quill/SharedArray.h"
#include "quill/VertexConnections.h"
#include "quill/VertexFrames.h"
#include "quill/WorkWatch.h"
#include "quill/mat4d.h"

#include <vector>

namespace neuralWarp {

/// Which neighbours a vertex is smoothed by, and how much: the edges of the polygons, by the inverse of their lengths
/// at rest. Throws what VertexConnections::build() throws.
///   weights     replaced, parallel to connections.connections()
///   restPoints  [map.affectCount()] object space
void buildConnections(quill::VertexConnections& connections, quill::SharedArray<float>& weights,
                      const quill::MeshTopology& topology, const quill::IndexMapper& map, const Points& restPoints);

/// The tables of a mesh of which every vertex is deformed. Those that the settings have no use for are empty.
struct RestTables {
    /// Measures them.
    ///   topology  its corners are below points.size(), or not looked at
    ///   points    of the rest shape, object space
    ///   watch     of the choice of frames, and of the smoothing; may end both
    /// Throws quill::Cancelled, std::length_error and std::bad_alloc.
    RestTables(const quill::MeshTopology& topology, const Points& points, const DeltaSettings& settings,
               const quill::WorkWatch& watch = {});

    /// Views of this object.
    RestSurface surface() const { return {connections, connectionWeights, frames, points, smoothedFramesInverse}; }

    quill::IndexMapper map; ///< all vertices
    quill::VertexConnections connections;
    quill::SharedArray<float> connectionWeights;
    quill::VertexFrames frames;
    quill::SharedArray<quill::val3<float>> points;
    quill::SharedArray<quill::mat4d> smoothedFramesInverse;
};

} // namespace neuralWarp
