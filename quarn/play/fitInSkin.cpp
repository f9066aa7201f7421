// SPDX-License-Identifier: Apache-2.0
#include "quarn/play/fitInSkin.h"

#include <Eigen/Eigenvalues>

#include <algorithm>
#include <cmath>

namespace quarn {
namespace {

// the largest factor by which any direction becomes longer: the root of the largest eigenvalue of M * transpose(M)
double stretchOf(const HMatrix& matrix) {
    Eigen::Matrix3d rows;
    for (unsigned i = 0; i < 9; ++i)
        rows(i / 3, i % 3) = matrix(i / 3, i % 3);
    const Eigen::Matrix3d square = rows * rows.transpose();
    const Eigen::SelfAdjointEigenSolver<Eigen::Matrix3d> solver(square, Eigen::EigenvaluesOnly);
    return std::sqrt(std::max(solver.eigenvalues()[2], 0.0));
}

double largestStretch(std::size_t frames, const SkinOfFrame& skin) {
    double largest = 0.0;
    for (std::size_t frame = 0; frame < frames; ++frame)
        for (const HMatrix& matrix : skin(frame))
            largest = std::max(largest, stretchOf(matrix));
    return largest;
}

double errorOf(const MorphClip& clip, const std::vector<ClipShape>& frames, const SkinOfFrame& skin) {
    double largest = 0.0;
    for (std::size_t frame = 0; frame < frames.size(); ++frame) {
        std::vector<double> off(clip.base.points.begin(), clip.base.points.end());
        for (std::size_t target = 0; target < clip.targets.size(); ++target) {
            const auto weight = static_cast<double>(clip.weights[frame * clip.targets.size() + target]);
            for (std::size_t i = 0; i < off.size(); ++i)
                off[i] += weight * static_cast<double>(clip.targets[target].shape.points[i]);
        }
        for (std::size_t i = 0; i < off.size(); ++i)
            off[i] -= static_cast<double>(frames[frame].points[i]);
        const std::vector<HMatrix> matrices = skin(frame);
        for (std::size_t vertex = 0; vertex < matrices.size(); ++vertex) {
            const HVector before(off[3 * vertex], off[3 * vertex + 1], off[3 * vertex + 2]);
            largest = std::max(largest, (before * matrices[vertex]).length());
        }
    }
    return largest;
}

} // namespace

FittedClip fitInSkin(const std::vector<ClipShape>& frames, double allowed, const SkinOfFrame& skin) {
    const double stretch = largestStretch(frames.size(), skin);
    FittedClip fit = fitClip(frames, stretch > 0.0 ? allowed / stretch : allowed);
    fit.error = errorOf(fit.clip, frames, skin);
    return fit;
}

} // namespace quarn
