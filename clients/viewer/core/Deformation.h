// SPDX-License-Identifier: Apache-2.0
// What the model does to the points that come in.
#pragma once

#include "Settings.h"
#include "frame/FrameSampler.h"
#include "frame/Network.h"
#include "frame/RestTables.h"
#include "frame/SlotMap.h"
#include "quill/MeshTopology.h"
#include "viewer/Blocks.h"

#include <memory>
#include <span>
#include <vector>

namespace viewer {

/// The tables, the network and the working arrays of the mesh, as neuralWarp::Deformer has them: frames have its bits,
/// where the network does. One thread at a time.
class Deformation {
public:
    /// Reads mesh.rest, model.vertices, weights, basis.* and network.*. Throws std::runtime_error for blocks that do
    /// not fit. `topology` as neuralWarp::RestTables takes it.
    Deformation(const Blocks& blocks, const Settings& settings, const quill::MeshTopology& topology);

    /// Computes a frame.
    ///   result    resized to the vertices
    ///   points    of all vertices, object space
    ///   controls  as many as the network takes
    ///   envelope  of the way to the model's positions
    void run(neuralWarp::Points& result, const neuralWarp::Points& points, std::span<const float> controls,
             float envelope);

private:
    neuralWarp::FrameModel frameModel() const;

    neuralWarp::DeltaSettings settings_;
    neuralWarp::RestTables rest_;
    neuralWarp::SlotMap slots_;
    neuralWarp::PrincipalBasis basis_;
    HeldArray<float> weights_; // empty: all 1
    std::unique_ptr<neuralWarp::Network> network_;
    neuralWarp::FrameWorkspace workspace_;
};

} // namespace viewer
