// SPDX-License-Identifier: Apache-2.0
// Determinants and the inverse by Laplace expansion along two pairs of rows: the six 2 x 2 minors of the upper two rows
// and the six of the lower two (the adjugate in minors, as in any text on linear algebra).
#include "openquarn/HMatrix.h"

#include "core/apiCall.h"
#include "values/invertMatrix.h"

#include <algorithm>
#include <array>
#include <cmath>
#include <cstdio>
#include <string>

using OpenQuarn::Operation;

namespace {

constexpr double singularVolume = 1e-15; // of rows with a largest value of 1 to 2: what rounding leaves of zero

/// Minors of two rows, by their pair of columns: 01, 02, 03, 12, 13, 23.
struct Minors {
    double m01, m02, m03, m12, m13, m23;
    Minors(const double* a, const double* b)
        : m01(a[0] * b[1] - a[1] * b[0])
        , m02(a[0] * b[2] - a[2] * b[0])
        , m03(a[0] * b[3] - a[3] * b[0])
        , m12(a[1] * b[2] - a[2] * b[1])
        , m13(a[1] * b[3] - a[3] * b[1])
        , m23(a[2] * b[3] - a[3] * b[2]) {}
};

double determinant(const Minors& upper, const Minors& lower) {
    return upper.m01 * lower.m23 - upper.m02 * lower.m13 + upper.m03 * lower.m12 + upper.m12 * lower.m03 -
           upper.m13 * lower.m02 + upper.m23 * lower.m01;
}

/// One column of the adjugate: the cofactors of the row whose partner (the other row of its pair) is `p`, with the
/// minors of the opposite pair.
void adjugateColumn(HMatrix& adjugate, unsigned column, const double* p, const Minors& o, double sign) {
    adjugate.matrix[0][column] = sign * (p[1] * o.m23 - p[2] * o.m13 + p[3] * o.m12);
    adjugate.matrix[1][column] = sign * (-p[0] * o.m23 + p[2] * o.m03 - p[3] * o.m02);
    adjugate.matrix[2][column] = sign * (p[0] * o.m13 - p[1] * o.m03 + p[3] * o.m01);
    adjugate.matrix[3][column] = sign * (-p[0] * o.m12 + p[1] * o.m02 - p[2] * o.m01);
}

HMatrix adjugate(const HMatrix& m, const Minors& upper, const Minors& lower) {
    HMatrix result;
    adjugateColumn(result, 0, m[1], lower, 1.0);
    adjugateColumn(result, 1, m[0], lower, -1.0);
    adjugateColumn(result, 2, m[3], upper, 1.0);
    adjugateColumn(result, 3, m[2], upper, -1.0);
    return result;
}

/// Divides each row by a power of two, which is exact, so that its largest value is 1 to 2. Returns the exponents.
struct Exponents {
    int row[4] = {};
};
Exponents equilibrate(HMatrix& m) {
    Exponents exponents;
    for (unsigned r = 0; r < 4; ++r) {
        double largest = 0.0;
        for (const double value : m.matrix[r])
            largest = std::max(largest, std::abs(value));
        if (largest == 0.0 || !std::isfinite(largest))
            continue;
        exponents.row[r] = std::ilogb(largest);
        for (double& value : m.matrix[r])
            value = std::scalbn(value, -exponents.row[r]);
    }
    return exponents;
}

std::string singularText(const HMatrix& m) {
    std::array<char, 80> text;
    std::snprintf(text.data(), text.size(), "a singular matrix (determinant %g) has no inverse", m.det4x4());
    return text.data();
}

bool isAffine(const HMatrix& m) {
    return m[0][3] == 0.0 && m[1][3] == 0.0 && m[2][3] == 0.0 && m[3][3] == 1.0;
}

} // namespace

bool OpenQuarn::invertMatrix(const HMatrix& matrix, HMatrix& inverse) noexcept {
    HMatrix scaled = matrix;
    const Exponents exponents = equilibrate(scaled);
    const Minors upper(scaled[0], scaled[1]);
    const Minors lower(scaled[2], scaled[3]);
    const double volume = determinant(upper, lower);
    if (!(std::abs(volume) > singularVolume) || !std::isfinite(volume))
        return false;
    inverse = adjugate(scaled, upper, lower);
    for (auto& row : inverse.matrix)
        for (unsigned c = 0; c < 4; ++c)
            row[c] = std::scalbn(row[c] / volume, -exponents.row[c]);
    if (isAffine(matrix))
        for (unsigned r = 0; r < 4; ++r)
            inverse[r][3] = r == 3 ? 1.0 : 0.0;
    return true;
}

bool HMatrix::isEquivalent(const HMatrix& other, double tolerance) const noexcept {
    for (unsigned r = 0; r < 4; ++r)
        for (unsigned c = 0; c < 4; ++c)
            if (!(std::abs(matrix[r][c] - other.matrix[r][c]) <= tolerance))
                return false;
    return true;
}

double HMatrix::det4x4() const noexcept {
    return determinant(Minors(matrix[0], matrix[1]), Minors(matrix[2], matrix[3]));
}

double HMatrix::det3x3() const noexcept {
    return (row(0) ^ row(1)) * row(2);
}

HMatrix HMatrix::inverse(HStatus* status) const noexcept {
    return OpenQuarn::apiValue(Operation::HMatrix_inverse, status, HMatrix(), [&](HStatus& outcome) {
        HMatrix result;
        if (!OpenQuarn::invertMatrix(*this, result))
            outcome = {HStatus::kFailure, singularText(*this)};
        return result;
    });
}
