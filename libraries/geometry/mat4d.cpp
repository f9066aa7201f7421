// SPDX-License-Identifier: Apache-2.0
#include "quill/mat4d.h"

#include <cmath>
#include <ostream>
#include <utility>

namespace quill {
namespace {

// Below this magnitude of the determinant, elimination takes over from the adjugate.
constexpr double smallestDeterminant = 1e-7;
// A pivot within this of zero is passed over.
constexpr double smallestPivot = 1e-15;

bool isPivot(double value) {
    return value > smallestPivot || value < -smallestPivot;
}

// The six 2x2 minors of two rows, r above s, from which the cofactors of a third row's elements are expanded.
struct RowPairMinors {
    double c01, c02, c03, c12, c13, c23;

    RowPairMinors(const mat4d& a, std::size_t r, std::size_t s) {
        const auto minor = [&](std::size_t i, std::size_t j) { return a(r, i) * a(s, j) - a(r, j) * a(s, i); };
        c01 = minor(0, 1), c02 = minor(0, 2), c03 = minor(0, 3);
        c12 = minor(1, 2), c13 = minor(1, 3), c23 = minor(2, 3);
    }

    // The 3x3 determinants of row `top` above the pair, each without one column and with the signs + - + -.
    std::array<double, 4> cofactors(const mat4d& a, std::size_t top) const {
        const double a0 = a(top, 0), a1 = a(top, 1), a2 = a(top, 2), a3 = a(top, 3);
        return {a1 * c23 - a2 * c13 + a3 * c12, -a0 * c23 + a2 * c03 - a3 * c02, a0 * c13 - a1 * c03 + a3 * c01,
                -a0 * c12 + a1 * c02 - a2 * c01};
    }
};

double expandAlongFirstRow(const mat4d& a, const std::array<double, 4>& cofactors) {
    return a(0, 0) * cofactors[0] + a(0, 1) * cofactors[1] + a(0, 2) * cofactors[2] + a(0, 3) * cofactors[3];
}

// The row from c downwards whose element in column c has the largest square; the first of equals.
std::size_t pivotRow(const mat4d& a, std::size_t c) {
    std::size_t best = c;
    double bestSquare = a(c, c) * a(c, c);
    for (std::size_t r = c + 1; r < 4; ++r) {
        const double square = a(r, c) * a(r, c);
        if (square > bestSquare) {
            best = r;
            bestSquare = square;
        }
    }
    return best;
}

void swapRows(mat4d& a, std::size_t r, std::size_t s) {
    for (std::size_t k = 0; k < 4; ++k)
        std::swap(a(r, k), a(s, k));
}

// Row r minus factor times row s.
void subtractRow(mat4d& a, std::size_t r, double factor, std::size_t s) {
    for (std::size_t k = 0; k < 4; ++k)
        a(r, k) -= factor * a(s, k);
}

void scaleRow(mat4d& a, std::size_t r, double factor) {
    for (std::size_t k = 0; k < 4; ++k)
        a(r, k) *= factor;
}

} // namespace

bool mat4d::isIdentity(double tolerance) const {
    for (std::size_t r = 0; r < 4; ++r)
        for (std::size_t c = 0; c < 4; ++c)
            if (!equivalent((*this)(r, c), r == c ? 1.0 : 0.0, tolerance))
                return false;
    return true;
}

double mat4d::determinant() const {
    return expandAlongFirstRow(*this, RowPairMinors(*this, 2, 3).cofactors(*this, 1));
}

void mat4d::inverse() {
    const RowPairMinors lower(*this, 2, 3);
    const auto row0 = lower.cofactors(*this, 1);
    const double d = expandAlongFirstRow(*this, row0);
    if (std::abs(d) < smallestDeterminant) {
        gaussJordanInverse();
        return;
    }
    const auto row1 = lower.cofactors(*this, 0);
    const auto row2 = RowPairMinors(*this, 1, 3).cofactors(*this, 0);
    const auto row3 = RowPairMinors(*this, 1, 2).cofactors(*this, 0);
    const double reciprocal = 1.0 / d;
    // the cofactors of rows 1 and 3 have the signs - + - +; the adjugate is the transpose
    for (std::size_t k = 0; k < 4; ++k) {
        (*this)(k, 0) = row0[k] * reciprocal;
        (*this)(k, 1) = -row1[k] * reciprocal;
        (*this)(k, 2) = row2[k] * reciprocal;
        (*this)(k, 3) = -row3[k] * reciprocal;
    }
}

// Gauss-Jordan elimination with partial pivoting (Golub and Van Loan, Matrix Computations, 3.4), every row operation
// applied to the matrix and to an accumulator that starts as the identity and ends as the inverse.
void mat4d::gaussJordanInverse() {
    mat4d a = *this;
    mat4d b;
    for (std::size_t c = 0; c < 4; ++c) {
        if (const std::size_t pivot = pivotRow(a, c); pivot != c) {
            swapRows(a, c, pivot);
            swapRows(b, c, pivot);
        }
        if (!isPivot(a(c, c)))
            continue;
        const double reciprocal = 1.0 / a(c, c);
        for (std::size_t r = c + 1; r < 4; ++r) {
            const double factor = a(r, c) * reciprocal;
            subtractRow(a, r, factor, c);
            subtractRow(b, r, factor, c);
            a(r, c) = 0.0;
        }
    }
    for (std::size_t i = 0; i < 4; ++i) {
        if (!isPivot(a(i, i)))
            continue;
        const double reciprocal = 1.0 / a(i, i);
        scaleRow(a, i, reciprocal);
        scaleRow(b, i, reciprocal);
        a(i, i) = 1.0;
    }
    for (std::size_t r = 0; r < 3; ++r) {
        for (std::size_t c = r + 1; c < 4; ++c) {
            const double factor = a(r, c);
            subtractRow(a, r, factor, c);
            subtractRow(b, r, factor, c);
            a(r, c) = 0.0;
        }
    }
    *this = b;
}

mat4d operator*(const mat4d& a, const mat4d& b) {
    mat4d product;
    for (std::size_t r = 0; r < 4; ++r)
        for (std::size_t c = 0; c < 4; ++c)
            product(r, c) = a(r, 0) * b(0, c) + a(r, 1) * b(1, c) + a(r, 2) * b(2, c) + a(r, 3) * b(3, c);
    return product;
}

std::ostream& operator<<(std::ostream& out, const mat4d& matrix) {
    for (std::size_t r = 0; r < 4; ++r) {
        out << (r == 0 ? "[[" : ", [");
        for (std::size_t c = 0; c < 4; ++c)
            out << (c == 0 ? "" : ", ") << matrix(r, c);
        out << ']';
    }
    return out << ']';
}

} // namespace quill
