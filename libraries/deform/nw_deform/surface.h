// SPDX-License-Identifier: Apache-2.0
// The surface that deltas are meant on, for whoever wants to see it. Object space; topology as RestTables takes it.
#pragma once

#include "frame/Points.h"
#include "frame/smoothing.h"
#include "quill/MeshTopology.h"
#include "quill/WorkWatch.h"
#include "quill/mat4d.h"

#include <cstdint>
#include <vector>

namespace neuralWarp {

/// Smooths points of a mesh as a frame does, by the neighbours of the rest shape, to the same bits.
///   points  in and out, as many as `rest`
///   passes  0 and less: none
/// Throws quill::Cancelled, std::length_error and std::bad_alloc. [any]
void smoothOnRest(Points& points, const quill::MeshTopology& topology, const Points& rest, std::int64_t passes,
                  const IsCancelled& isCancelled = {});

/// The frames of all vertices at `points`, by the pairs of neighbours that are chosen on the rest shape
/// (quill::VertexFrames). `points` as many as `rest`. Throws the same. [any]
std::vector<quill::mat4d> framesOnRest(const Points& points, const quill::MeshTopology& topology, const Points& rest,
                                       const quill::WorkWatch& watch = {});

} // namespace neuralWarp
