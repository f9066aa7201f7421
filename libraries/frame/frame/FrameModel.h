// SPDX-License-Identifier: Apache-2.0
// What the frames of one geometry have in common: the views that a frame is computed through. Nothing is owned, and
// what is viewed outlives the frame and does not change meanwhile.
#pragma once

#include "frame/DeltaSettings.h"
#include "frame/Points.h"
#include "frame/PrincipalBasis.h"
#include "frame/SlotMap.h"
#include "quill/VertexConnections.h"
#include "quill/VertexFrames.h"

#include <cstddef>
#include <cstdint>
#include <vector>

namespace neuralWarp {

/// The shape at rest. Object space, one entry per deformed vertex; tables that the settings have no use for may be
/// empty.
struct RestSurface {
    const quill::VertexConnections& connections;            ///< what smoothing averages over
    const std::vector<float>& connectionWeights;            ///< parallel to connections.connections()
    const quill::VertexFrames& frames;                      ///< Surface mode: which neighbours make a frame
    const Points& points;                                   ///< unsmoothed
    const std::vector<quill::mat4d>& smoothedFramesInverse; ///< Surface mode: of the smoothed points
};

/// The principal shapes of a model whose network gives their coefficients.
struct ShapeBasis {
    /// False: the outputs of the network are the deltas themselves.
    bool isUsed() const { return shapeCount != 0 && slotCount != 0; }
    /// How many slots there are values for, whatever the counts say. Only while isUsed().
    std::size_t coveredSlots() const { return values.shapeCount() == shapeCount ? values.slotCount() : 0; }

    const PrincipalBasis& values;
    std::uint64_t shapeCount = 0; ///< the counts are a file's, and not trusted
    std::uint64_t slotCount = 0;
};

struct FrameModel {
    DeltaSettings settings;
    std::size_t vertexCount; ///< of those that are deformed
    DrivenVertices driven;
    std::size_t slotCount; ///< how many slots are read: the highest in use + 1
    ShapeBasis shapes;
    RestSurface rest;
};

} // namespace neuralWarp
