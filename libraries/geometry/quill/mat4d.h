// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "quill/val3.h"

#include <array>
#include <cstddef>
#include <iosfwd>

namespace quill {

/// A 4x4 matrix of doubles, row-major: element (r, c) is m[4 * r + c]. Points are row vectors on the left, p' = p * M:
/// rows 0 to 2 are the images of the x, y and z axes, row 3 is the translation (m[12], m[13], m[14]) and column 3 is
/// (0, 0, 0, 1) for an affine matrix. A frame keeps its X, Y, Z axes in rows 0 to 2 and its origin in row 3.
/// A new matrix is the identity, and so is every element by which a vector of matrices grows.
/// No operation fails or throws; all are safe on any thread.
struct mat4d {
    std::array<double, 16> m{1, 0, 0, 0, 0, 1, 0, 0, 0, 0, 1, 0, 0, 0, 0, 1};

    double& operator()(std::size_t r, std::size_t c) { return m[4 * r + c]; }
    double operator()(std::size_t r, std::size_t c) const { return m[4 * r + c]; }

    void setToIdentity() { *this = mat4d(); }

    /// True when every element is within the tolerance (inclusive) of the identity's.
    bool isIdentity(double tolerance) const;

    /// Cofactor expansion along the first row.
    double determinant() const;

    /// Inverts in place: adjugate over determinant, or gaussJordanInverse() when |determinant| < 1e-7.
    void inverse();

    /// Inverts in place by elimination with row pivoting. Columns whose pivot is within 1e-15 of zero are passed over,
    /// so every matrix has a result: the zero matrix becomes the identity, a singular frame a finite best effort.
    void gaussJordanInverse();

    friend bool operator==(const mat4d& a, const mat4d& b) = default;
};

/// The matrix product, a on the left: p * (a * b) applies a first.
mat4d operator*(const mat4d& a, const mat4d& b);
inline mat4d& operator*=(mat4d& a, const mat4d& b) {
    return a = a * b;
}

/// p * M with the translation; the fourth column is ignored. Computed in double and narrowed to T at the end.
template <typename T>
val3<T> transformAsPoint(const val3<T>& p, const mat4d& matrix) {
    const auto& m = matrix.m;
    const double x = p.x, y = p.y, z = p.z;
    return {static_cast<T>(x * m[0] + y * m[4] + z * m[8] + m[12]),
            static_cast<T>(x * m[1] + y * m[5] + z * m[9] + m[13]),
            static_cast<T>(x * m[2] + y * m[6] + z * m[10] + m[14])};
}

/// p * M without the translation. Computed in double and narrowed to T at the end.
template <typename T>
val3<T> transformAsVector(const val3<T>& p, const mat4d& matrix) {
    const auto& m = matrix.m;
    const double x = p.x, y = p.y, z = p.z;
    return {static_cast<T>(x * m[0] + y * m[4] + z * m[8]), static_cast<T>(x * m[1] + y * m[5] + z * m[9]),
            static_cast<T>(x * m[2] + y * m[6] + z * m[10])};
}

/// Writes "[[m00, m01, m02, m03], [...], [...], [...]]" in the stream's own number format.
std::ostream& operator<<(std::ostream& out, const mat4d& matrix);

} // namespace quill
