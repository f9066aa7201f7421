// SPDX-License-Identifier: Apache-2.0
// Source: principal component analysis by the method of snapshots (L. Sirovich, "Turbulence and the dynamics of
// coherent structures", 1987): with fewer frames than coordinates, the eigenvectors of the frames' products with each
// other.
#include "quarn/play/fitClip.h"

#include <Eigen/Eigenvalues>

#include <algorithm>
#include <cmath>

namespace quarn {
namespace {

using Rows = Eigen::Matrix<double, Eigen::Dynamic, Eigen::Dynamic, Eigen::RowMajor>; ///< a row for each frame
using Row = Eigen::RowVectorXd;

Rows rowsOf(const std::vector<ClipShape>& frames, std::vector<float> ClipShape::*part) {
    Rows rows(static_cast<Eigen::Index>(frames.size()), static_cast<Eigen::Index>((frames[0].*part).size()));
    for (Eigen::Index frame = 0; frame < rows.rows(); ++frame) {
        const std::vector<float>& numbers = frames[static_cast<std::size_t>(frame)].*part;
        rows.row(frame) = Eigen::Map<const Eigen::RowVectorXf>(numbers.data(), rows.cols()).cast<double>();
    }
    return rows;
}

std::vector<float> singles(const Row& row) {
    std::vector<float> numbers(static_cast<std::size_t>(row.size()));
    std::transform(row.begin(), row.end(), numbers.begin(), [](double value) { return static_cast<float>(value); });
    return numbers;
}

double largestLength(const Rows& vectors) {
    double square = 0.0;
    for (Eigen::Index i = 0; i < vectors.size(); i += 3)
        square = std::max(square, Eigen::Map<const Eigen::Vector3d>(vectors.data() + i).squaredNorm());
    return std::sqrt(square);
}

// the eigenvector with the largest eigenvalue first
Eigen::MatrixXd principalCourses(const Rows& differences) {
    const Eigen::SelfAdjointEigenSolver<Eigen::MatrixXd> solver(differences * differences.transpose());
    return solver.eigenvectors().rowwise().reverse();
}

// how many courses leave at most `allowed`; all but one where none do, as the courses of n frames about their mean have
// n - 1 dimensions
Eigen::Index countFor(const Eigen::MatrixXd& courses, Rows rest, double allowed) {
    Eigen::Index count = 0;
    while (count < courses.cols() - 1 && (count == 0 || largestLength(rest) > allowed)) {
        const Row shape = courses.col(count).transpose() * rest;
        rest.noalias() -= courses.col(count++) * shape;
    }
    return count;
}

// base and shapes for weights from 0 to 1: the least of each course is in the base, and its range in the shape
struct Range {
    Row least, width;
};

Range rangeOf(const Eigen::MatrixXd& courses) {
    Range range{courses.colwise().minCoeff(), Row()};
    range.width = courses.colwise().maxCoeff() - range.least;
    return range;
}

MorphClip clipOf(const Eigen::MatrixXd& courses, const std::vector<ClipShape>& frames) {
    MorphClip clip;
    const Range range = rangeOf(courses);
    clip.targets.resize(static_cast<std::size_t>(courses.cols()));
    for (std::vector<float> ClipShape::*part : {&ClipShape::points, &ClipShape::normals}) {
        Rows rows = rowsOf(frames, part);
        const Row mean = rows.colwise().mean();
        rows.rowwise() -= mean;
        const Rows shapes = courses.transpose() * rows;
        clip.base.*part = singles(mean + range.least * shapes);
        for (std::size_t target = 0; target < clip.targets.size(); ++target) {
            const auto number = static_cast<Eigen::Index>(target);
            clip.targets[target].name = "shape " + std::to_string(target + 1);
            clip.targets[target].shape.*part = singles(range.width[number] * shapes.row(number));
        }
    }
    for (Eigen::Index frame = 0; frame < courses.rows(); ++frame)
        for (Eigen::Index target = 0; target < courses.cols(); ++target) {
            const double above = courses(frame, target) - range.least[target];
            const double weight = above > 0.0 ? above / range.width[target] : 0.0; // a course may stand still
            clip.weights.push_back(static_cast<float>(std::min(weight, 1.0)));
        }
    return clip;
}

// of what is written, in single precision
double errorOf(const MorphClip& clip, const std::vector<ClipShape>& frames) {
    Rows rest = rowsOf(frames, &ClipShape::points);
    const auto part = [&](const std::vector<float>& numbers) {
        return Row(Eigen::Map<const Eigen::RowVectorXf>(numbers.data(), rest.cols()).cast<double>());
    };
    rest.rowwise() -= part(clip.base.points);
    for (std::size_t target = 0; target < clip.targets.size(); ++target) {
        const Row shape = part(clip.targets[target].shape.points);
        for (Eigen::Index frame = 0; frame < rest.rows(); ++frame) {
            const std::size_t place = static_cast<std::size_t>(frame) * clip.targets.size() + target;
            rest.row(frame) -= static_cast<double>(clip.weights[place]) * shape;
        }
    }
    return largestLength(rest);
}

} // namespace

FittedClip fitClip(const std::vector<ClipShape>& frames, double allowed) {
    Rows differences = rowsOf(frames, &ClipShape::points);
    const Row mean = differences.colwise().mean();
    differences.rowwise() -= mean;
    const Eigen::MatrixXd courses = principalCourses(differences);
    Eigen::Index count = countFor(courses, std::move(differences), allowed);
    FittedClip fitted{clipOf(courses.leftCols(count), frames), 0.0};
    fitted.error = errorOf(fitted.clip, frames);
    // rounding may take what the last shape was just enough for
    while (fitted.error > allowed && count < courses.cols() - 1) {
        fitted.clip = clipOf(courses.leftCols(++count), frames);
        fitted.error = errorOf(fitted.clip, frames);
    }
    return fitted;
}

} // namespace quarn
