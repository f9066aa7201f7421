// SPDX-License-Identifier: Apache-2.0
// 4 x 4 matrices of doubles, row-major, for row vectors: p' = p * M, and A * B does A first, then B.
#pragma once

#include "openquarn/HApi.h"
#include "openquarn/HPoint.h"
#include "openquarn/HStatus.h"
#include "openquarn/HVector.h"

/// Sixteen doubles; the identity by default. The translation is in row 3; column 3 is 0, 0, 0, 1 in every matrix that
/// has no perspective. Trivially copyable. `[any]` throughout.
class HMatrix {
public:
    double matrix[4][4] = {{1, 0, 0, 0}, {0, 1, 0, 0}, {0, 0, 1, 0}, {0, 0, 0, 1}}; ///< [row][column]

    constexpr HMatrix() noexcept = default;
    /// Copies sixteen values, matrix[row][column].
    constexpr explicit HMatrix(const double (&values)[4][4]) noexcept {
        for (unsigned row = 0; row < 4; ++row)
            for (unsigned column = 0; column < 4; ++column)
                matrix[row][column] = values[row][column];
    }

    /// Row and column 0 to 3, not checked.
    constexpr double& operator()(unsigned row, unsigned column) noexcept { return matrix[row][column]; }
    constexpr double operator()(unsigned row, unsigned column) const noexcept { return matrix[row][column]; }
    /// The four values of a row 0 to 3, not checked.
    constexpr double* operator[](unsigned row) noexcept { return matrix[row]; }
    constexpr const double* operator[](unsigned row) const noexcept { return matrix[row]; }
    /// The first three values of a row 0 to 3, not checked: an axis, or for row 3 the translation.
    constexpr HVector row(unsigned index) const noexcept {
        return {matrix[index][0], matrix[index][1], matrix[index][2]};
    }
    constexpr void setRow(unsigned index, const HVector& values) noexcept {
        matrix[index][0] = values.x;
        matrix[index][1] = values.y;
        matrix[index][2] = values.z;
    }

    constexpr HMatrix& setToIdentity() noexcept { return *this = HMatrix(); }
    constexpr HMatrix transpose() const noexcept;
    constexpr HMatrix operator*(const HMatrix& right) const noexcept;
    constexpr HMatrix& operator*=(const HMatrix& right) noexcept { return *this = *this * right; }
    constexpr HMatrix operator*(double factor) const noexcept;
    constexpr HMatrix operator+(const HMatrix& other) const noexcept;
    constexpr HMatrix operator-(const HMatrix& other) const noexcept { return *this + other * -1.0; }

    /// Exact comparison of all values; see isEquivalent().
    constexpr bool operator==(const HMatrix& other) const noexcept;
    constexpr bool operator!=(const HMatrix& other) const noexcept { return !(*this == other); }
    /// True when no value differs by more than `tolerance`.
    OPENQUARN_API bool isEquivalent(const HMatrix& other, double tolerance = 1e-10) const noexcept;

    /// The matrix N with N * M = M * N = identity, exact in column 3 when M has no perspective. A singular matrix has
    /// none: kFailure, and the identity is returned. Singular means that the four rows, each scaled to a largest value
    /// between 1 and 2, span a volume of at most 1e-15 (or that a value is infinite or not a number).
    OPENQUARN_API HMatrix inverse(HStatus* status = nullptr) const noexcept;
    OPENQUARN_API double det4x4() const noexcept;
    /// Of the upper left 3 x 3 part: below 0 for a mirroring transformation.
    OPENQUARN_API double det3x3() const noexcept;
};

constexpr HMatrix HMatrix::transpose() const noexcept {
    HMatrix result;
    for (unsigned r = 0; r < 4; ++r)
        for (unsigned c = 0; c < 4; ++c)
            result.matrix[r][c] = matrix[c][r];
    return result;
}

constexpr HMatrix HMatrix::operator*(const HMatrix& right) const noexcept {
    HMatrix result;
    for (unsigned r = 0; r < 4; ++r)
        for (unsigned c = 0; c < 4; ++c)
            result.matrix[r][c] = matrix[r][0] * right.matrix[0][c] + matrix[r][1] * right.matrix[1][c] +
                                  matrix[r][2] * right.matrix[2][c] + matrix[r][3] * right.matrix[3][c];
    return result;
}

constexpr HMatrix HMatrix::operator*(double factor) const noexcept {
    HMatrix result;
    for (unsigned r = 0; r < 4; ++r)
        for (unsigned c = 0; c < 4; ++c)
            result.matrix[r][c] = matrix[r][c] * factor;
    return result;
}

constexpr HMatrix HMatrix::operator+(const HMatrix& other) const noexcept {
    HMatrix result;
    for (unsigned r = 0; r < 4; ++r)
        for (unsigned c = 0; c < 4; ++c)
            result.matrix[r][c] = matrix[r][c] + other.matrix[r][c];
    return result;
}

constexpr bool HMatrix::operator==(const HMatrix& other) const noexcept {
    for (unsigned r = 0; r < 4; ++r)
        for (unsigned c = 0; c < 4; ++c)
            if (matrix[r][c] != other.matrix[r][c])
                return false;
    return true;
}

/// The point transformed, w included; not divided by w.
constexpr HPoint operator*(const HPoint& p, const HMatrix& m) noexcept {
    const auto column = [&](unsigned c) {
        return p.x * m.matrix[0][c] + p.y * m.matrix[1][c] + p.z * m.matrix[2][c] + p.w * m.matrix[3][c];
    };
    return {column(0), column(1), column(2), column(3)};
}
constexpr HPoint& operator*=(HPoint& p, const HMatrix& m) noexcept {
    return p = p * m;
}

/// The vector transformed by the upper left 3 x 3 part: a translation does not move it.
constexpr HVector operator*(const HVector& v, const HMatrix& m) noexcept {
    const auto column = [&](unsigned c) { return v.x * m.matrix[0][c] + v.y * m.matrix[1][c] + v.z * m.matrix[2][c]; };
    return {column(0), column(1), column(2)};
}
constexpr HVector& operator*=(HVector& v, const HMatrix& m) noexcept {
    return v = v * m;
}
