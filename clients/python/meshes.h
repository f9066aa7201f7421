// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "python/arrays.h"

#include "frame/Points.h"
#include "quill/MeshTopology.h"

#include <cstddef>

namespace neuralWarp::python {

/// Polygons: an array [F, k], or a tuple of the numbers of corners [F] and of all corners. Every corner is a vertex of
/// `vertexCount`, or a ValueError names it.
quill::MeshTopology topologyOf(pybind11::handle faces, std::size_t vertexCount);

/// A copy of an array [N, 3].
Points pointsOf(const FloatArray& array);

} // namespace neuralWarp::python
