// SPDX-License-Identifier: Apache-2.0
#include "eigenProduct.h"

#include <Eigen/Sparse>

struct EigenProduct::Matrices {
    Eigen::SparseMatrix<float, Eigen::RowMajor> average;
    Eigen::Matrix<float, Eigen::Dynamic, 3, Eigen::RowMajor> source, destination;
};

EigenProduct::EigenProduct(const quill::VertexConnections& connections, const std::vector<float>& weights,
                           const std::vector<quill::val3<float>>& points)
    : matrices_(std::make_unique<Matrices>()) {
    const auto n = static_cast<Eigen::Index>(points.size());
    const auto& indexer = connections.connectionsIndexer();
    std::vector<Eigen::Triplet<float>> entries;
    entries.reserve(weights.size());
    for (std::size_t i = 0; i < points.size(); ++i)
        for (std::uint32_t k = indexer[i]; k < indexer[i + 1]; ++k)
            entries.emplace_back(static_cast<int>(i), static_cast<int>(connections.connections()[k]),
                                 weights[k] / static_cast<float>(indexer[i + 1] - indexer[i]));
    matrices_->average.resize(n, n);
    matrices_->average.setFromTriplets(entries.begin(), entries.end());
    matrices_->source.resize(n, 3);
    matrices_->destination.resize(n, 3);
    for (std::size_t i = 0; i < points.size(); ++i)
        matrices_->source.row(static_cast<Eigen::Index>(i)) << points[i].x, points[i].y, points[i].z;
}

EigenProduct::~EigenProduct() = default;

void EigenProduct::pass() {
    matrices_->destination.noalias() = matrices_->average * matrices_->source;
    matrices_->destination.swap(matrices_->source);
}
