// SPDX-License-Identifier: Apache-2.0
#include "quill/mat4d.h"
#include "quill/bulk.h"

#include <gmock/gmock.h>

#include <cmath>
#include <cstring>
#include <random>
#include <sstream>

namespace {

using quill::mat4d;
using quill::val3;

mat4d diagonal(double a, double b, double c, double d) {
    return {{a, 0, 0, 0, 0, b, 0, 0, 0, 0, c, 0, 0, 0, 0, d}};
}

mat4d translation(double x, double y, double z) {
    return {{1, 0, 0, 0, 0, 1, 0, 0, 0, 0, 1, 0, x, y, z, 1}};
}

mat4d randomMatrix(std::mt19937& random) {
    std::uniform_real_distribution<double> uniform(-2.0, 2.0);
    mat4d matrix;
    for (double& element : matrix.m)
        element = uniform(random);
    return matrix;
}

double largestDifference(const mat4d& a, const mat4d& b) {
    double largest = 0.0;
    for (std::size_t k = 0; k < 16; ++k)
        largest = std::max(largest, std::abs(a.m[k] - b.m[k]));
    return largest;
}

// The longest vector that stays as it is, and the next longer one, which does not.
template <typename T>
void expectNormalizeLimit() {
    const T limit = static_cast<T>(1e-20);
    T x = static_cast<T>(1e-10);
    for (int ulps = 0; ulps < 8; ++ulps)
        x = std::nextafter(x, T(1));
    while (x * x > limit)
        x = std::nextafter(x, T(0));
    val3<T> unchanged{0, x, 0}, changed{0, std::nextafter(x, T(1)), 0};
    unchanged.normalize();
    changed.normalize();
    EXPECT_EQ(unchanged.y, x);
    EXPECT_NEAR(changed.y, 1.0, 1e-6);
}

TEST(val3, NormalizeLeavesShortVectorsAlone) {
    expectNormalizeLimit<float>();
    expectNormalizeLimit<double>();
    val3<float> zero, v{3, 0, 4};
    zero.normalize();
    v.normalize();
    EXPECT_EQ(zero, val3<float>());
    EXPECT_FLOAT_EQ(v.x, 0.6F);
    EXPECT_FLOAT_EQ(v.z, 0.8F);
}

TEST(mat4d, InverseTimesMatrixIsTheIdentityByBothRoutes) {
    std::mt19937 random(11);
    int compared = 0;
    for (int i = 0; i < 2000; ++i) {
        const mat4d matrix = randomMatrix(random);
        mat4d adjugate = matrix, elimination = matrix;
        adjugate.inverse();
        elimination.gaussJordanInverse();
        const double condition = std::abs(matrix.determinant());
        if (condition < 0.05)
            continue;
        ++compared;
        EXPECT_TRUE((matrix * adjugate).isIdentity(1e-10)) << matrix;
        EXPECT_LT(largestDifference(adjugate, elimination), 1e-9) << matrix;
    }
    EXPECT_GT(compared, 1500);
}

TEST(mat4d, InverseOfSpecialMatrices) {
    struct Row {
        const char* what;
        mat4d matrix;
        mat4d inverse;
    };
    for (const Row& row :
         {Row{"identity", {}, {}}, Row{"determinant 1e-9", diagonal(1e-3, 1e-3, 1e-3, 1), diagonal(1e3, 1e3, 1e3, 1)},
          Row{"zero", diagonal(0, 0, 0, 0), {}}, Row{"flat", diagonal(2, 0, 4, 1), diagonal(0.5, 1, 0.25, 1)},
          Row{"translation", translation(1, 2, 3), translation(-1, -2, -3)},
          Row{"pivot from below",
              {{0, 2, 0, 0, 4, 0, 0, 0, 0, 0, 1, 0, 0, 0, 0, 1}},
              {{0, 0.25, 0, 0, 0.5, 0, 0, 0, 0, 0, 1, 0, 0, 0, 0, 1}}}}) {
        mat4d inverse = row.matrix, elimination = row.matrix;
        inverse.inverse();
        elimination.gaussJordanInverse();
        EXPECT_LT(largestDifference(inverse, row.inverse), 1e-12) << row.what << ": " << inverse;
        EXPECT_LT(largestDifference(elimination, row.inverse), 1e-12) << row.what << ": " << elimination;
    }
}

TEST(mat4d, RankDeficientFramesHaveAFiniteInverse) {
    std::mt19937 random(7);
    for (int i = 0; i < 3000; ++i) {
        mat4d matrix = randomMatrix(random);
        for (std::size_t c = 0; c < 4; ++c) {
            if (i % 3 == 0)
                matrix(1, c) = 2.0 * matrix(0, c);
            if (i % 3 <= 1)
                matrix(2, c) = 0.0;
            if (i % 5 == 0)
                matrix(0, c) = matrix(3, c) = 0.0;
        }
        mat4d elimination = matrix;
        elimination.gaussJordanInverse();
        matrix.inverse();
        for (std::size_t k = 0; k < 16; ++k)
            EXPECT_TRUE(std::isfinite(matrix.m[k]) && std::isfinite(elimination.m[k]));
    }
}

TEST(mat4d, ProductAppliesTheLeftFactorFirstAndMayOverwriteIt) {
    mat4d a = diagonal(2, 2, 2, 1);
    const mat4d b = translation(1, 2, 3);
    EXPECT_EQ(transformAsPoint(val3<double>(1, 1, 1), a * b), val3<double>(3, 4, 5));
    EXPECT_EQ(transformAsVector(val3<double>(1, 1, 1), a * b), val3<double>(2, 2, 2));
    a *= b;
    EXPECT_EQ(a, diagonal(2, 2, 2, 1) * b);
    a *= a;
    EXPECT_EQ(a, (diagonal(2, 2, 2, 1) * b) * (diagonal(2, 2, 2, 1) * b));
}

TEST(mat4d, IdentityWithinTheToleranceIncluded) {
    mat4d atLimit, beyond;
    atLimit(0, 3) = 1e-6;
    atLimit(2, 2) = 0.5;
    beyond(3, 0) = 1.0000001e-6;
    EXPECT_TRUE(atLimit.isIdentity(0.5));
    EXPECT_FALSE(atLimit.isIdentity(0.499));
    EXPECT_FALSE(beyond.isIdentity(1e-6));
}

TEST(bulk, EachOperationDoesWhatTheSingleOneDoes) {
    std::mt19937 random(4);
    const mat4d matrix = randomMatrix(random);
    std::vector<val3<float>> points(777);
    std::vector<mat4d> frames(333);
    for (std::size_t i = 0; i < points.size(); ++i)
        points[i] = {static_cast<float>(i) * 0.37F, 1.5F, -static_cast<float>(i)};
    for (auto& frame : frames)
        frame = randomMatrix(random);

    auto movedPoints = points;
    auto movedFrames = frames, inverted = frames;
    std::vector<float> floats(3, 9.0F);
    quill::multAsPoint(movedPoints, matrix);
    quill::multFrames(movedFrames, matrix);
    quill::invertFrames(inverted);
    quill::convertToFloatArray(frames, floats);

    for (std::size_t i = 0; i < points.size(); ++i)
        ASSERT_EQ(movedPoints[i], transformAsPoint(points[i], matrix));
    ASSERT_EQ(floats.size(), 16 * frames.size());
    for (std::size_t i = 0; i < frames.size(); ++i) {
        ASSERT_EQ(movedFrames[i], frames[i] * matrix);
        mat4d inverse = frames[i];
        inverse.inverse();
        ASSERT_EQ(inverted[i], inverse);
        for (std::size_t k = 0; k < 16; ++k)
            ASSERT_EQ(floats[16 * i + k], static_cast<float>(frames[i].m[k]));
    }
}

TEST(bulk, AlmostTheIdentityLeavesEveryBitAlone) {
    mat4d almost;
    for (std::size_t k = 0; k < 16; ++k)
        almost.m[k] += k % 2 == 0 ? 9.99e-7 : -9.99e-7;
    std::vector<val3<float>> points{{1, 2, 3}, {1e20F, -0.0F, 5e-30F}};
    std::vector<mat4d> frames{translation(1, 0, 0)};
    const auto before = points;
    quill::multAsPoint(points, almost);
    quill::multFrames(frames, almost);
    EXPECT_EQ(std::memcmp(points.data(), before.data(), sizeof(points[0]) * points.size()), 0);
    EXPECT_EQ(frames[0], translation(1, 0, 0));
    quill::multFrames(frames, translation(0, 5, 0));
    EXPECT_EQ(frames[0], translation(1, 5, 0));
}

} // namespace
