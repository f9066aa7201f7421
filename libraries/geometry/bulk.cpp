// SPDX-License-Identifier: Apache-2.0
#include "quill/bulk.h"

#include "quill/parallelFor.h"

namespace quill {
namespace {

constexpr double identityTolerance = 1e-6;

} // namespace

void multAsPoint(std::vector<val3<float>>& points, const mat4d& matrix) {
    if (matrix.isIdentity(identityTolerance))
        return;
    parallelFor(points.size(), [&](std::size_t i) { points[i] = transformAsPoint(points[i], matrix); });
}

void multFrames(std::vector<mat4d>& frames, const mat4d& matrix) {
    if (matrix.isIdentity(identityTolerance))
        return;
    parallelFor(frames.size(), [&](std::size_t i) { frames[i] *= matrix; });
}

void invertFrames(std::vector<mat4d>& frames) {
    parallelFor(frames.size(), [&](std::size_t i) { frames[i].inverse(); });
}

void convertToFloatArray(const std::vector<mat4d>& frames, std::vector<float>& out) {
    out.resize(16 * frames.size());
    parallelFor(frames.size(), [&](std::size_t i) {
        for (std::size_t k = 0; k < 16; ++k)
            out[16 * i + k] = static_cast<float>(frames[i].m[k]);
    });
}

} // namespace quill
