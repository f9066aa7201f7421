// SPDX-License-Identifier: Apache-2.0
#include "quill/mat4d.h"
#include "quill/bulk.h"

#include <gmock/gmock.h>

#include <algorithm>
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

bool areNear(const mat4d& a, const mat4d& b, double tolerance) {
    return std::equal(a.m.begin(), a.m.end(), b.m.begin(),
                      [=](double x, double y) { return std::abs(x - y) < tolerance; });
}

TEST(val3, NormalizeLeavesShortVectorsAlone) {
    for (const double tiny : {0.0, 0.99e-10}) {
        val3<double> two{0, tiny, 0};
        val3<float> one{0, static_cast<float>(tiny), 0};
        const auto before = one;
        two.normalize();
        one.normalize();
        EXPECT_EQ(two.y, tiny);
        EXPECT_EQ(one, before);
    }
    for (const double scale : {1.0, 0.21e-10}) {
        val3<double> two{3 * scale, 0, 4 * scale};
        val3<float> one{static_cast<float>(two.x), 0, static_cast<float>(two.z)};
        two.normalize();
        one.normalize();
        EXPECT_DOUBLE_EQ(two.x, 0.6);
        EXPECT_FLOAT_EQ(one.z, 0.8F);
    }
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
        EXPECT_TRUE(areNear(adjugate, elimination, 1e-9)) << matrix;
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
          Row{"a tiny pivot below the largest",
              {{0, 1, 0, 0, 5, 1, 0, 0, 1e-13, 1, 1, 0, 0, 0, 0, 1}},
              {{-0.2, 0.2, 0, 0, 1, 0, 0, 0, -1, 0, 1, 0, 0, 0, 0, 1}}},
          Row{"pivot from below",
              {{0, 2, 0, 0, 4, 0, 0, 0, 0, 0, 1, 0, 0, 0, 0, 1}},
              {{0, 0.25, 0, 0, 0.5, 0, 0, 0, 0, 0, 1, 0, 0, 0, 0, 1}}}}) {
        mat4d inverse = row.matrix, elimination = row.matrix;
        inverse.inverse();
        elimination.gaussJordanInverse();
        EXPECT_TRUE(areNear(inverse, row.inverse, 1e-12)) << row.what << ": " << inverse;
        EXPECT_TRUE(areNear(elimination, row.inverse, 1e-12)) << row.what << ": " << elimination;
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
