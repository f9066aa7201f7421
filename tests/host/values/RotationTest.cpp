// SPDX-License-Identifier: Apache-2.0
// Euler angles, quaternions and matrices of the same rotation, in all six orders and in gimbal lock.
#include "openquarn/HQuaternion.h"

#include <gtest/gtest.h>

#include <cmath>
#include <random>
#include <vector>

namespace {

const double pi = std::acos(-1.0);

struct Order {
    HEulerRotation::RotationOrder order;
    unsigned axes[3]; // as the name spells them
};
constexpr Order orders[] = {{HEulerRotation::kXYZ, {0, 1, 2}}, {HEulerRotation::kYZX, {1, 2, 0}},
                            {HEulerRotation::kZXY, {2, 0, 1}}, {HEulerRotation::kXZY, {0, 2, 1}},
                            {HEulerRotation::kYXZ, {1, 0, 2}}, {HEulerRotation::kZYX, {2, 1, 0}}};

/// Turns the next axis towards the one after it.
HMatrix aboutAxis(unsigned axis, double angle) {
    HMatrix m;
    const unsigned next = (axis + 1) % 3;
    const unsigned last = (axis + 2) % 3;
    m[next][next] = m[last][last] = std::cos(angle);
    m[next][last] = std::sin(angle);
    m[last][next] = -std::sin(angle);
    return m;
}

/// First, middle and last angle; the middle one at, close to and far from the ends.
std::vector<HVector> angleTriples() {
    std::vector<HVector> triples;
    for (const double first : {-3.0, -0.4, 0.0, 1.7, pi})
        for (const double last : {-2.2, 0.0, 0.9, pi})
            for (const double offset : {0.0, 1e-15, 1e-12, 1e-8, 1e-4, 0.3, pi / 2})
                for (const double end : {-1.0, 1.0})
                    triples.emplace_back(first, end * (pi / 2 - offset), last);
    return triples;
}

HEulerRotation inOrder(const Order& order, const HVector& triple) {
    HEulerRotation angles(0, 0, 0, order.order);
    for (unsigned i = 0; i < 3; ++i)
        angles[order.axes[i]] = triple[i];
    return angles;
}

HQuaternion randomRotation(std::mt19937& engine) {
    std::normal_distribution<double> normal;
    const double x = normal(engine);
    const double y = normal(engine);
    const double z = normal(engine);
    return HQuaternion(x, y, z, normal(engine)).normal();
}

TEST(EulerRotation, TurnsAboutTheAxesInTheNamedOrder) {
    for (const Order& order : orders)
        for (const HVector& triple : angleTriples()) {
            const HMatrix expected = aboutAxis(order.axes[0], triple.x) * aboutAxis(order.axes[1], triple.y) *
                                     aboutAxis(order.axes[2], triple.z);
            EXPECT_TRUE(inOrder(order, triple).asMatrix().isEquivalent(expected, 1e-15)) << order.order;
        }
}

TEST(EulerRotation, ComesBackFromItsMatrixAlsoInGimbalLock) {
    for (const Order& order : orders)
        for (const HVector& triple : angleTriples()) {
            const HEulerRotation angles = inOrder(order, triple);
            const HEulerRotation back = HEulerRotation::fromMatrix(angles.asMatrix(), order.order);
            EXPECT_TRUE(back.asMatrix().isEquivalent(angles.asMatrix(), 2e-15)) << order.order << " " << triple.y;
            EXPECT_LE(std::abs(back[order.axes[1]]), pi / 2);
            const double fromLock = pi / 2 - std::abs(triple.y);
            if (fromLock < 1e-16) {
                EXPECT_EQ(back[order.axes[2]], 0.0) << order.order;
            }
            if (fromLock > 0.1) {
                EXPECT_NEAR(std::remainder(back[order.axes[2]] - triple.z, 2 * pi), 0.0, 1e-13) << order.order;
            }
        }
}

TEST(EulerRotation, ReorderingAndQuaternionsKeepTheRotation) {
    for (const Order& order : orders)
        for (const HVector& triple : angleTriples()) {
            const HEulerRotation angles = inOrder(order, triple);
            EXPECT_TRUE(angles.asQuaternion().asMatrix().isEquivalent(angles.asMatrix(), 2e-15)) << order.order;
            for (const Order& other : orders) {
                const HEulerRotation reordered = HEulerRotation(angles).reorderIt(other.order);
                EXPECT_EQ(reordered.order, other.order);
                EXPECT_TRUE(reordered.asMatrix().isEquivalent(angles.asMatrix(), 3e-15)) << order.order << other.order;
            }
            EXPECT_EQ(angles.reorder(order.order), angles);
        }
}

TEST(Quaternion, ComesBackFromItsMatrixAndAngles) {
    std::mt19937 engine(7);
    std::vector<HQuaternion> rotations = {{1, 0, 0, 0}, {0, 1, 0, 0}, {0, 0, 1, 0}, {0, 0, 0, 1}};
    for (int i = 0; i < 500; ++i)
        rotations.push_back(randomRotation(engine));
    for (const HQuaternion& q : rotations) {
        const HQuaternion positive = q.w < 0.0 ? -q : q;
        EXPECT_TRUE(HQuaternion::fromMatrix(q.asMatrix()).isEquivalent(positive, 1e-15));
        for (const Order& order : orders)
            EXPECT_TRUE(q.asEulerRotation(order.order).asMatrix().isEquivalent(q.asMatrix(), 2e-15));
    }
}

TEST(Quaternion, ProductAndConjugateAreThoseOfTheMatrices) {
    std::mt19937 engine(8);
    for (int i = 0; i < 200; ++i) {
        const HQuaternion p = randomRotation(engine);
        const HQuaternion q = randomRotation(engine);
        EXPECT_TRUE((p * q).asMatrix().isEquivalent(p.asMatrix() * q.asMatrix(), 2e-15));
        EXPECT_TRUE(p.conjugate().asMatrix().isEquivalent(p.asMatrix().transpose(), 1e-15));
        EXPECT_TRUE((p * p.conjugate()).isEquivalent(HQuaternion(), 1e-15));
    }
    // a quarter turn about z takes x to y
    EXPECT_TRUE((HVector(1, 0, 0) * HQuaternion(pi / 2, {0, 0, 5}).asMatrix()).isEquivalent({0, 1, 0}, 1e-15));
}

TEST(Quaternion, WithoutADirectionIsTheIdentity) {
    EXPECT_EQ(HQuaternion(1.0, HVector()), HQuaternion());
    EXPECT_EQ(HQuaternion(0, 0, 0, 0).normalizeIt(), HQuaternion());
    EXPECT_EQ(HQuaternion(0, 0, 0, 0).asMatrix(), HMatrix());
    EXPECT_TRUE(HQuaternion(3e200, 0, 4e200, 0).normal().isEquivalent({0.6, 0, 0.8, 0}, 1e-15));
}

TEST(Quaternion, SlerpTurnsAtConstantSpeedTheShorterWay) {
    const HVector axis(1, 2, -2);
    for (const double angle : {0.0, 1e-9, 1e-3, 1.0, 3.0, 3.1415926})
        for (const double sign : {1.0, -1.0})
            for (const double t : {0.0, 0.25, 0.5, 1.0, 1.5}) {
                const HQuaternion turned(angle, axis);
                const HQuaternion to = sign > 0.0 ? turned : -turned;
                const HQuaternion found = HQuaternion::slerp(HQuaternion(), to, t);
                EXPECT_TRUE(found.isEquivalent(HQuaternion(t * angle, axis), 1e-14)) << angle << " " << t;
            }
}

} // namespace
