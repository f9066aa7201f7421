// SPDX-License-Identifier: Apache-2.0
#include "quarn/dataset/ControlFit.h"

#include <Eigen/Cholesky>
#include <Eigen/Core>

#include <cmath>

namespace quarn {

struct ControlFit::Impl {
    Eigen::RowVectorXd centre, scale;
    Eigen::MatrixXd rows; // [rows][controls], brought to their range
    double width = 1.0;   // mean squared distance of two rows
    Eigen::LLT<Eigen::MatrixXd> solver;

    Eigen::RowVectorXd brought(std::span<const float> controls) const {
        const Eigen::Map<const Eigen::RowVectorXf> raw(controls.data(), static_cast<Eigen::Index>(controls.size()));
        return (raw.cast<double>() - centre).cwiseProduct(scale);
    }
    double kernel(const Eigen::RowVectorXd& a, const Eigen::RowVectorXd& b) const {
        return 1.0 + a.dot(b) / width + std::exp(-(a - b).squaredNorm() / width);
    }
};

ControlFit::ControlFit(const std::vector<std::vector<float>>& rows)
    : impl_(std::make_unique<Impl>()) {
    Impl& fit = *impl_;
    const auto count = static_cast<Eigen::Index>(rows.size());
    const auto controls = static_cast<Eigen::Index>(rows.front().size());
    Eigen::MatrixXd raw(count, controls);
    for (Eigen::Index row = 0; row < count; ++row)
        for (Eigen::Index i = 0; i < controls; ++i)
            raw(row, i) = rows[static_cast<std::size_t>(row)][static_cast<std::size_t>(i)];
    fit.centre = raw.colwise().mean();
    const Eigen::RowVectorXd extent = raw.colwise().maxCoeff() - raw.colwise().minCoeff();
    fit.scale = extent.unaryExpr([](double range) { return range > 0.0 ? 1.0 / range : 0.0; });
    fit.rows = (raw.rowwise() - fit.centre) * fit.scale.asDiagonal();
    // of centred rows: twice their mean squared length
    const double squared = 2.0 * fit.rows.squaredNorm() / static_cast<double>(count);
    fit.width = squared > 0.0 ? squared : 1.0;
    Eigen::MatrixXd gram(count, count);
    for (Eigen::Index a = 0; a < count; ++a)
        for (Eigen::Index b = 0; b <= a; ++b)
            gram(a, b) = gram(b, a) = fit.kernel(fit.rows.row(a), fit.rows.row(b));
    constexpr double ridge = 1e-5;
    gram.diagonal().array() += ridge * gram.diagonal().mean();
    fit.solver.compute(gram);
}

ControlFit::~ControlFit() = default;

std::vector<float> ControlFit::weights(std::span<const float> controls) const {
    const Impl& fit = *impl_;
    const Eigen::RowVectorXd here = fit.brought(controls);
    Eigen::VectorXd likeness(fit.rows.rows());
    for (Eigen::Index row = 0; row < likeness.size(); ++row)
        likeness[row] = fit.kernel(fit.rows.row(row), here);
    const Eigen::VectorXd weights = fit.solver.solve(likeness);
    return {weights.data(), weights.data() + weights.size()};
}

} // namespace quarn
