// SPDX-License-Identifier: Apache-2.0
// Compiled without errno for square roots, which otherwise keeps the loops below from being vectorised.
#include "frameBlock.h"

#include <cmath>

namespace quill {
val3<float> FrameTables::normalSum(std::size_t vertex) const {
    val3<float> sum;
    if (!hasPairs(vertex))
        return sum;
    const val3<float> here = positions[vertex];
    for (std::uint32_t k = indexer[vertex]; k < indexer[vertex + 1]; k += 2)
        sum += quill::cross(positions[pairs[k]] - here, positions[pairs[k + 1]] - here);
    return sum;
}

// val3::normalize for each vector: where it would leave one alone, multiplying by 1 does. Two loops, so that the
// compiler does not move the square root behind the comparison, where it could not be vectorised (decision 0013).
void FrameBlock::normalize(Vectors& v, std::size_t count) {
    std::array<float, capacity> square, reciprocal;
    for (std::size_t j = 0; j < count; ++j) {
        square[j] = v.x[j] * v.x[j] + v.y[j] * v.y[j] + v.z[j] * v.z[j];
        reciprocal[j] = 1.0F / std::sqrt(square[j]);
    }
    for (std::size_t j = 0; j < count; ++j) {
        const float unit = reciprocal[j];
        const float factor = square[j] > static_cast<float>(1e-20) ? unit : 1.0F;
        v.x[j] *= factor;
        v.y[j] *= factor;
        v.z[j] *= factor;
    }
}

void FrameBlock::cross(const Vectors& a, const Vectors& b, Vectors& out, std::size_t count) {
    for (std::size_t j = 0; j < count; ++j) {
        out.x[j] = a.y[j] * b.z[j] - a.z[j] * b.y[j];
        out.y[j] = a.z[j] * b.x[j] - a.x[j] * b.z[j];
        out.z[j] = a.x[j] * b.y[j] - a.y[j] * b.x[j];
    }
}

void FrameBlock::measureNormals(const FrameTables& tables, const std::size_t* vertices, std::size_t count) {
    for (std::size_t j = 0; j < count; ++j)
        normal_.set(j, tables.normalSum(vertices[j]));
    normalize(normal_, count);
}

void FrameBlock::takeNormals(const val3<float>* normals, const std::size_t* vertices, std::size_t count) {
    for (std::size_t j = 0; j < count; ++j)
        normal_.set(j, normals[vertices[j]]);
}

void FrameBlock::buildAxes(const FrameTables& tables, const std::size_t* vertices, std::size_t count) {
    for (std::size_t j = 0; j < count; ++j) {
        const std::size_t v = vertices[j];
        tangent_.set(j, tables.hasPairs(v) ? tables.positions[tables.pairs[tables.indexer[v]]] - tables.positions[v]
                                           : val3<float>());
    }
    normalize(tangent_, count);
    cross(normal_, tangent_, x_, count);
    normalize(x_, count);
    cross(x_, normal_, y_, count);
}

} // namespace quill
