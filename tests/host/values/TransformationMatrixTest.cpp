// SPDX-License-Identifier: Apache-2.0
// Decomposition of transformations: parts are recovered, and any matrix comes back from its parts.
#include "openquarn/HString.h"
#include "openquarn/HTransformationMatrix.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <cmath>
#include <random>
#include <string>
#include <vector>

namespace {

struct Case {
    std::string name;
    HMatrix matrix;
};

HMatrix fromRows(const HVector& a, const HVector& b, const HVector& c, const HVector& translation = {}) {
    HMatrix m;
    m.setRow(0, a);
    m.setRow(1, b);
    m.setRow(2, c);
    m.setRow(3, translation);
    return m;
}

class Random {
public:
    double operator()() { return distribution_(engine_); }
    HVector vector() {
        const double x = (*this)();
        const double y = (*this)();
        return {x, y, (*this)()};
    }

private:
    std::mt19937 engine_{20};
    std::uniform_real_distribution<double> distribution_{-2.0, 2.0};
};

std::vector<Case> regularCases() {
    Random random;
    std::vector<Case> cases;
    for (int i = 0; i < 300; ++i) {
        const HVector a = random.vector();
        const HVector b = random.vector();
        const HVector c = random.vector();
        const double nearly = std::pow(10.0, -(i % 17));
        cases.push_back({"random", fromRows(a, b, c, random.vector())});
        cases.push_back({"mirrored", fromRows(a, c, b)});
        cases.push_back({"sheared", fromRows(a, 9.0 * a + b, 7.0 * b - 5.0 * a + c)});
        cases.push_back({"nearly dependent", fromRows(a, 2.0 * a + nearly * b, b - a + nearly * c)});
        cases.push_back({"unequal", fromRows(a * 1e150, b * 1e-150, c * 1e300)});
        cases.push_back({"tiny", fromRows(a * 1e-300, b * 1e-300, c * 1e-290)});
    }
    return cases;
}

std::vector<Case> singularCases() {
    Random random;
    std::vector<Case> cases;
    for (int i = 0; i < 100; ++i) {
        const HVector a = random.vector();
        const HVector b = random.vector();
        const HVector zero;
        cases.push_back({"parallel rows 0 and 1", fromRows(a, -3.0 * a, b)});
        cases.push_back({"parallel rows 1 and 2", fromRows(b, a, 0.3 * a)});
        cases.push_back({"row 2 in the plane of the others", fromRows(a, b, 0.7 * a - b)});
        cases.push_back({"all parallel", fromRows(a, 0.1 * a, -a)});
        for (unsigned zeros = 1; zeros < 8; ++zeros)
            cases.push_back({"zero rows " + std::to_string(zeros),
                             fromRows(zeros & 1U ? zero : a, zeros & 2U ? zero : b, zeros & 4U ? zero : a + b)});
        cases.push_back({"zero row, the others parallel", fromRows(zero, a, 3.0 * a)});
    }
    return cases;
}

/// Largest difference of a row, by the length of the row.
double recompositionError(const HMatrix& expected, const HMatrix& actual) {
    double worst = 0.0;
    for (unsigned r = 0; r < 4; ++r) {
        const double size = expected.row(r).length();
        const double difference = (expected.row(r) - actual.row(r)).length();
        worst = std::max(worst, size > 0.0 ? difference / size : difference);
    }
    return worst;
}

bool isProperRotation(const HMatrix& r) {
    return (r * r.transpose()).isEquivalent(HMatrix(), 4e-15) && r.det3x3() > 0.0;
}

void expectSoundParts(const Case& tested) {
    const HTransformationMatrix parts(tested.matrix);
    EXPECT_LE(recompositionError(tested.matrix, parts.asMatrix()), 4e-15) << tested.name;
    EXPECT_TRUE(isProperRotation(parts.asRotateMatrix())) << tested.name;
    EXPECT_NEAR(parts.rotation().length(), 1.0, 1e-15) << tested.name;
    double shear[3] = {};
    ASSERT_FALSE(parts.getShear(shear, HSpace::kTransform).error());
    for (const double value : shear)
        EXPECT_TRUE(std::isfinite(value)) << tested.name;
}

TEST(TransformationMatrix, RecomposesRegularMatrices) {
    for (const Case& tested : regularCases()) {
        expectSoundParts(tested);
        double scale[3] = {};
        ASSERT_FALSE(HTransformationMatrix(tested.matrix).getScale(scale, HSpace::kTransform).error());
        const bool mirrored = std::signbit(scale[0]);
        for (const double value : scale)
            EXPECT_TRUE(value != 0.0 && std::signbit(value) == mirrored) << tested.name;
        // where dependence is not a matter of rounding, the determinant says which
        if (tested.name == "random" || tested.name == "mirrored") {
            EXPECT_EQ(mirrored, tested.matrix.det3x3() < 0.0) << tested.name;
        }
    }
}

TEST(TransformationMatrix, RecomposesSingularMatricesFromFiniteParts) {
    for (const Case& tested : singularCases())
        expectSoundParts(tested);
}

TEST(TransformationMatrix, FlatMatricesKeepTheAxesTheyHave) {
    const HTransformationMatrix flat(fromRows({2, 0, 0}, {0, 0, 0}, {0, 0, 3}));
    EXPECT_EQ(flat.asRotateMatrix(), HMatrix());
    double scale[3] = {};
    ASSERT_FALSE(flat.getScale(scale, HSpace::kTransform).error());
    EXPECT_EQ(HVector(scale[0], scale[1], scale[2]), HVector(2, 0, 3));
    EXPECT_EQ(HTransformationMatrix(fromRows({}, {}, {})).asRotateMatrix(), HMatrix());
}

TEST(TransformationMatrix, RecoversThePartsItWasBuiltFrom) {
    const double scale[3] = {0.5, 2.0, 3.0};
    const double shear[3] = {0.25, -1.5, 0.75};
    const HEulerRotation angles(0.3, -0.8, 2.1, HEulerRotation::kZXY);
    for (const double sign : {1.0, -1.0}) {
        HTransformationMatrix built;
        const double signedScale[3] = {sign * scale[0], sign * scale[1], sign * scale[2]};
        EXPECT_FALSE(built.setScale(signedScale, HSpace::kTransform).error());
        EXPECT_FALSE(built.setShear(shear, HSpace::kTransform).error());
        EXPECT_FALSE(built.setTranslation({1, 2, 3}, HSpace::kTransform).error());
        built.setRotation(angles);
        EXPECT_EQ(built.rotationOrder(), HEulerRotation::kZXY);

        HTransformationMatrix found(built.asMatrix());
        EXPECT_EQ(found.rotationOrder(), HEulerRotation::kXYZ);
        EXPECT_FALSE(found.reorderRotation(HEulerRotation::kZXY).error());
        EXPECT_TRUE(found.eulerRotation().isEquivalent(angles, 1e-14));
        EXPECT_EQ(found.translation(HSpace::kWorld), HVector(1, 2, 3));
        double foundScale[3] = {};
        double foundShear[3] = {};
        EXPECT_FALSE(found.getScale(foundScale, HSpace::kObject).error());
        EXPECT_FALSE(found.getShear(foundShear, HSpace::kObject).error());
        for (unsigned i = 0; i < 3; ++i) {
            EXPECT_NEAR(foundScale[i], signedScale[i], 1e-14);
            EXPECT_NEAR(foundShear[i], shear[i], 1e-14);
        }
    }
}

TEST(TransformationMatrix, TheOrderOfThePartsIsScaleShearRotationTranslation) {
    HTransformationMatrix built;
    const double scale[3] = {2, 3, 4};
    const double shear[3] = {0.5, 0.25, 0.125};
    ASSERT_FALSE(built.setScale(scale, HSpace::kTransform).error());
    ASSERT_FALSE(built.setShear(shear, HSpace::kTransform).error());
    built.setRotation(HQuaternion(std::acos(0.0), {0, 0, 1}));
    ASSERT_FALSE(built.setTranslation({7, 8, 9}, HSpace::kTransform).error());
    const HMatrix scaling = fromRows({2, 0, 0}, {0, 3, 0}, {0, 0, 4});
    const HMatrix shearing = fromRows({1, 0, 0}, {0.5, 1, 0}, {0.25, 0.125, 1});
    const HMatrix turning = fromRows({0, 1, 0}, {-1, 0, 0}, {0, 0, 1}); // a quarter turn about z
    const HMatrix moving = fromRows({1, 0, 0}, {0, 1, 0}, {0, 0, 1}, {7, 8, 9});
    EXPECT_TRUE(built.asMatrix().isEquivalent(scaling * shearing * turning * moving, 1e-14));
}

TEST(TransformationMatrix, TranslationInObjectSpaceActsBeforeTheRest) {
    Random random;
    HTransformationMatrix tested(fromRows(random.vector(), random.vector(), random.vector(), {1, -2, 3}));
    const HVector inObject = tested.translation(HSpace::kObject);
    EXPECT_TRUE((HPoint(inObject) * HTransformationMatrix(tested).asMatrix())
                    .isEquivalent(HPoint(1, -2, 3) + HVector(1, -2, 3), 1e-12));
    EXPECT_FALSE(tested.setTranslation(inObject, HSpace::kObject).error());
    EXPECT_TRUE(tested.translation(HSpace::kTransform).isEquivalent({1, -2, 3}, 1e-12));

    HStatus status;
    const HTransformationMatrix flat(fromRows({1, 0, 0}, {1, 0, 0}, {0, 0, 1}, {1, 2, 3}));
    EXPECT_EQ(flat.translation(HSpace::kObject, &status), HVector());
    EXPECT_EQ(status, HStatus::kFailure);
}

TEST(TransformationMatrix, RefusesBadArgumentsAndStaysAsItWas) {
    HTransformationMatrix tested;
    double numbers[3] = {4, 5, 6};
    const std::vector<HStatus> statuses = {
        tested.getScale(nullptr, HSpace::kTransform),        tested.getShear(nullptr, HSpace::kTransform),
        tested.setScale(nullptr, HSpace::kTransform),        tested.setShear(nullptr, HSpace::kTransform),
        tested.getScale(numbers, HSpace::kInvalid),          tested.setScale(numbers, HSpace::kInvalid),
        tested.setTranslation({1, 1, 1}, HSpace::Space(99)), tested.reorderRotation(HEulerRotation::RotationOrder(6)),
    };
    for (const HStatus& status : statuses) {
        EXPECT_EQ(status, HStatus::kInvalidParameter);
        EXPECT_GT(status.errorString().length(), 20U);
    }
    HStatus status;
    tested.translation(HSpace::kInvalid, &status);
    EXPECT_EQ(status, HStatus::kInvalidParameter);
    EXPECT_EQ(tested.asMatrix(), HMatrix());
    EXPECT_EQ(numbers[0], 4.0);
}

} // namespace
