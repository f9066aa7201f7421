// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "quill/mat4d.h"
#include "quill/val3.h"

#include <vector>

/// Data-parallel operations over whole arrays of points and frames, at most INT_MAX elements each. The calling thread
/// waits for the loop; the arrays must not be touched from elsewhere meanwhile. Empty arrays are fine. Only
/// convertToFloatArray allocates.
namespace quill {

/// Replaces every point p by p * matrix (as a point; double arithmetic, narrowed to float at the end). A matrix that is
/// the identity within 1e-6 leaves every point as it is, bit for bit.
void multAsPoint(std::vector<val3<float>>& points, const mat4d& matrix);

/// Replaces every frame F by F * matrix. A matrix that is the identity within 1e-6 leaves every frame as it is.
void multFrames(std::vector<mat4d>& frames, const mat4d& matrix);

/// Replaces every frame by its inverse (mat4d::inverse).
void invertFrames(std::vector<mat4d>& frames);

/// Resizes out to 16 floats per frame; out[16 * i + k] is element k of frame i in storage order, narrowed to float.
void convertToFloatArray(const std::vector<mat4d>& frames, std::vector<float>& out);

} // namespace quill
