// SPDX-License-Identifier: Apache-2.0
#include "openquarn/HMatrix.h"
#include "openquarn/HString.h"

#include <gtest/gtest.h>

#include <cmath>
#include <limits>
#include <random>
#include <type_traits>

namespace {

static_assert(std::is_trivially_copyable_v<HPoint> && sizeof(HPoint) == 32);
static_assert(std::is_trivially_copyable_v<HVector> && sizeof(HVector) == 24);
static_assert(std::is_trivially_copyable_v<HMatrix> && sizeof(HMatrix) == 128);

HMatrix affine(std::mt19937& engine) {
    std::uniform_real_distribution<double> values(-3.0, 3.0);
    HMatrix m;
    for (auto& row : m.matrix)
        for (unsigned c = 0; c < 3; ++c)
            row[c] = values(engine);
    return m;
}

TEST(Vector, ProductsAndAngles) {
    const HVector x(1, 0, 0);
    const HVector y(0, 1, 0);
    EXPECT_EQ(x ^ y, HVector(0, 0, 1));
    EXPECT_EQ(HVector(1, 2, 3) * HVector(4, -5, 6), 12.0);
    EXPECT_NEAR(x.angle(y), std::acos(0.0), 1e-15);
    EXPECT_NEAR(x.angle(HVector(1, 1e-9, 0)), 1e-9, 1e-24); // where a cosine would give 0
    EXPECT_EQ(x.angle(HVector()), 0.0);
}

TEST(Vector, NormalisesWhatHasADirection) {
    const double infinity = std::numeric_limits<double>::infinity();
    for (const double size : {1.0, 1e-200, 1e200, 5e-324 * 64}) {
        HVector v = HVector(3, 0, -4) * size;
        EXPECT_NEAR(v.length() / size, 5.0, 1e-15) << size;
        EXPECT_TRUE(v.normalize().isEquivalent({0.6, 0, -0.8}, 1e-15)) << size;
    }
    EXPECT_EQ(HVector().normalize(), HVector());
    EXPECT_EQ(HVector(infinity, 0, 1).normalize(), HVector(infinity, 0, 1));
}

TEST(Point, IsMovedByTranslationsAndAVectorIsNot) {
    HMatrix m;
    m.setRow(0, {0, 2, 0});
    m.setRow(1, {-3, 0, 0});
    m.setRow(3, {10, 20, 30});
    EXPECT_EQ(HPoint(1, 1, 1) * m, HPoint(7, 22, 31));
    EXPECT_EQ(HPoint(1, 1, 1, 0) * m, HPoint(-3, 2, 1, 0));
    EXPECT_EQ(HVector(1, 1, 1) * m, HVector(-3, 2, 1));
    m[0][3] = 1.0; // perspective
    EXPECT_EQ(HPoint(1, 1, 1) * m, HPoint(7, 22, 31, 2));
}

TEST(Point, ArithmeticCarriesWAlong) {
    const HPoint p(1, 2, 3, 4);
    EXPECT_EQ(p + HVector(1, 1, 1), HPoint(2, 3, 4, 4));
    EXPECT_EQ(p - HVector(1, 1, 1), HPoint(0, 1, 2, 4));
    EXPECT_EQ(p - HPoint(3, 2, 1), HVector(-2, 0, 2));
    EXPECT_EQ(p * 2.0, HPoint(2, 4, 6, 4));
    EXPECT_EQ(HPoint(p).cartesianize(), HPoint(0.25, 0.5, 0.75));
    EXPECT_EQ(HPoint(1, 2, 3, 0).cartesianize(), HPoint(1, 2, 3, 0));
}

TEST(Matrix, ProductDoesTheLeftOneFirst) {
    std::mt19937 engine(3);
    const HMatrix a = affine(engine);
    const HMatrix b = affine(engine);
    const HPoint p(0.3, -2, 5);
    EXPECT_TRUE(((p * a) * b).isEquivalent(p * (a * b), 1e-12));
    EXPECT_TRUE((a * b).transpose().isEquivalent(b.transpose() * a.transpose(), 1e-12));
    EXPECT_NEAR((a * b).det4x4(), a.det4x4() * b.det4x4(), 1e-11);
    EXPECT_NEAR(a.det3x3(), a.det4x4(), 1e-13);
}

TEST(Matrix, InverseUndoes) {
    std::mt19937 engine(4);
    std::uniform_real_distribution<double> values(-1.0, 1.0);
    for (int i = 0; i < 200; ++i) {
        HMatrix m = affine(engine);
        if (i % 2 == 1)
            for (auto& row : m.matrix)
                row[3] = values(engine);
        HStatus status;
        const HMatrix inverse = m.inverse(&status);
        ASSERT_FALSE(status.error()) << status.errorString().asChar();
        EXPECT_TRUE((m * inverse).isEquivalent(HMatrix(), 1e-10));
        EXPECT_TRUE((inverse * m).isEquivalent(HMatrix(), 1e-10));
        for (unsigned r = 0; i % 2 == 0 && r < 4; ++r)
            EXPECT_EQ(inverse[r][3], r == 3 ? 1.0 : 0.0);
    }
}

TEST(Matrix, InverseOfSmallScalesFarFromTheOrigin) {
    HMatrix m = HMatrix() * 1e-12;
    m[0][0] = 1e-120;
    m[3][3] = 1.0;
    m.setRow(3, {1e5, 2e5, 3e5});
    HStatus status;
    const HMatrix inverse = m.inverse(&status);
    ASSERT_FALSE(status.error()) << status.errorString().asChar();
    const HVector scale(1e120, 1e12, 1e12);
    const HVector translation(-1e125, -2e17, -3e17);
    for (unsigned i = 0; i < 3; ++i) {
        EXPECT_NEAR(inverse[i][i] / scale[i], 1.0, 1e-14);
        EXPECT_NEAR(inverse[3][i] / translation[i], 1.0, 1e-14);
    }
}

TEST(Matrix, SingularMatricesHaveNoInverse) {
    HMatrix zeroRow;
    zeroRow.setRow(1, {});
    HMatrix dependent;
    dependent.setRow(0, {0.1, 0.2, 0.3});
    dependent.setRow(1, {0.4, 0.5, 0.6});
    dependent.setRow(2, {0.7, 0.8, 0.9});
    HMatrix notANumber;
    notANumber[2][1] = std::numeric_limits<double>::quiet_NaN();
    for (const HMatrix& m : {zeroRow, dependent, dependent * 1e-50, notANumber, HMatrix() * 0.0}) {
        HStatus status;
        EXPECT_EQ(m.inverse(&status), HMatrix());
        EXPECT_EQ(status, HStatus::kFailure);
        EXPECT_NE(status.errorString().asStdString().find("determinant"), std::string::npos);
    }
}

} // namespace
