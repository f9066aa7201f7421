// SPDX-License-Identifier: Apache-2.0
// A mesh that a model deforms, without a host.
#pragma once

#include "frame/FrameModel.h"
#include "frame/FrameWorkspace.h"
#include "frame/RestTables.h"
#include "frame/SlotMap.h"
#include "frame/smoothing.h"
#include "nw_deform/Model.h"
#include "quill/MeshTopology.h"
#include "quill/WorkWatch.h"

#include <atomic>
#include <cstddef>
#include <memory>
#include <span>
#include <stdexcept>

namespace neuralWarp {

/// Somebody else is using it at this moment.
struct DeformerInUse : std::runtime_error {
    DeformerInUse()
        : std::runtime_error("the deformer is in use on another thread: each thread needs one of its own") {}
};

/// What one frame of a mesh is made of. Nothing is owned, and nothing is kept.
struct Pose {
    const float* points; ///< [3 * vertexCount()] as the rig makes them, object space
    std::span<const float> controls;
    float envelope = 1.0F;          ///< of the way to the model's positions, finite
    const float* weights = nullptr; ///< [vertexCount()] the same for each vertex, finite; null: all 1
};

/// The tables, the network and the working arrays of one mesh: what the plug-in's node has of a geometry, all of whose
/// vertices are deformed. One thread at a time; different objects are independent. Frames have the same bits as those
/// of the plug-in whose positions are rounded to single precision, on any number of threads.
class Deformer {
public:
    /// Measures the mesh at rest.
    ///   model     of a mesh of as many vertices
    ///   topology  its polygons; a corner that is no vertex is a caller's error, and passed over
    ///   rest      [model->metadata().fullCount] points of the rest shape, object space, all finite
    ///   watch     may end the work, which then throws quill::Cancelled
    /// Throws std::invalid_argument, which names what is wrong, std::length_error and std::bad_alloc.
    Deformer(std::shared_ptr<const Model> model, const quill::MeshTopology& topology, const Points& rest,
             const quill::WorkWatch& watch = {});
    ~Deformer();
    Deformer(const Deformer&) = delete;
    Deformer& operator=(const Deformer&) = delete;

    const std::shared_ptr<const Model>& model() const { return model_; }
    std::size_t vertexCount() const { return rest_.points.size(); }

    /// Computes a frame.
    ///   out          [3 * vertexCount()] where the positions go, object space; overlaps nothing of the pose. What it
    ///                holds after an exception is void
    ///   isCancelled  asked in long smoothing, which then throws quill::Cancelled
    /// Throws std::invalid_argument for controls that are not model()->controlCount(), and for a number that is not
    /// finite, the first of which it names; DeformerInUse; std::runtime_error when the network fails; std::bad_alloc.
    void evaluate(const Pose& pose, float* out, const IsCancelled& isCancelled = {});

private:
    void check(const Pose& pose) const;
    FrameModel frameModel() const;
    void place(const Pose& pose, const IsCancelled& isCancelled);

    std::shared_ptr<const Model> model_;
    std::unique_ptr<ModelSession> session_;
    RestTables rest_;
    SlotMap slots_;
    FrameWorkspace workspace_;
    std::atomic<bool> isInUse_ = false;
};

} // namespace neuralWarp
