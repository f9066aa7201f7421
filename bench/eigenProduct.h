// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "quill/VertexConnections.h"

#include <memory>
#include <vector>

// A smoothing pass as Eigen's product of a row-major sparse matrix (weights over counts) and a dense n x 3 matrix.
class EigenProduct {
public:
    EigenProduct(const quill::VertexConnections& connections, const std::vector<float>& weights,
                 const std::vector<quill::val3<float>>& points);
    ~EigenProduct();
    void pass();

private:
    struct Matrices;
    std::unique_ptr<Matrices> matrices_;
};
