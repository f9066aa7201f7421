// SPDX-License-Identifier: Apache-2.0
#include "quarn/rig/RigTest.h"

#include "openquarn/HQuaternion.h"

#include <numbers>

namespace {

class AnimCurve : public RigTest {
protected:
    AnimCurve() {
        run("createNode animCurve -name c; setAttr c.keyTimes 1 3 7; setAttr c.keyValues 10 20 -4;"
            "setAttr c.keyInTangents 9 2 -1; setAttr c.keyOutTangents 3 0.5 8");
    }

    static double at(double time) {
        run("setAttr c.time " + OpenQuarn::printedValue(time));
        return number("c.output");
    }
};

TEST_F(AnimCurve, InterpolatesAndIsConstantOutside) {
    // p(s) = a + b s + c s^2 + d s^3 through both keys with both slopes
    const auto cubic = [](double from, double out, double to, double in, double length, double s) {
        const double b = out * length, e = in * length;
        return from + b * s + (3 * (to - from) - 2 * b - e) * s * s + (2 * (from - to) + b + e) * s * s * s;
    };
    struct Row {
        double time, step, linear, spline;
    };
    const Row rows[] = {
        {-5, 10, 10, 10},
        {1, 10, 10, 10},
        {1.5, 10, 12.5, cubic(10, 3, 20, 2, 2, 0.25)},
        {2.999, 10, 19.995, cubic(10, 3, 20, 2, 2, 0.9995)},
        {3, 20, 20, 20},
        {6, 20, 2, cubic(20, 0.5, -4, -1, 4, 0.75)},
        {7, -4, -4, -4},
        {1e9, -4, -4, -4},
    };
    for (const Row& row : rows) {
        run("setAttr c.interpolation step");
        EXPECT_EQ(at(row.time), row.step) << row.time;
        run("setAttr c.interpolation linear");
        EXPECT_NEAR(at(row.time), row.linear, 1e-12) << row.time;
        run("setAttr c.interpolation spline");
        EXPECT_NEAR(at(row.time), row.spline, 1e-12) << row.time;
    }
}

TEST_F(AnimCurve, FollowsItsKeys) {
    run("setAttr c.time 2");
    EXPECT_EQ(number("c.output"), 15.0);
    run("setAttr c.keyValues 0 2 4");
    EXPECT_EQ(number("c.output"), 1.0);
    run("setAttr c.keyTimes 2 3 7");
    EXPECT_EQ(number("c.output"), 0.0);
    run("setAttr c.keyTimes; setAttr c.keyValues");
    EXPECT_EQ(number("c.output"), 0.0); // no keys
    run("setAttr c.keyTimes 5; setAttr c.keyValues 8; connectAttr time1.outTime c.time");
    EXPECT_EQ(number("c.output"), 8.0);
}

TEST_F(AnimCurve, KeepsTheLastValueOfDamagedKeysAndSaysWhy) {
    struct Row {
        const char* script;
        const char* problem;
    };
    const Row rows[] = {
        {"setAttr c.keyTimes 1 3 3", "keyTimes[2] is 3, not above keyTimes[1], which is 3"},
        {"setAttr c.keyTimes 1 3", "keyValues has 3 values; 2 keyTimes need 2"},
        {"setAttr c.keyValues 1", "keyValues has 1 values; 3 keyTimes need 3"},
        {"setAttr c.keyInTangents; getAttr c.output; setAttr c.interpolation spline", // which is when they matter
         "keyInTangents has 0 values; 3 keyTimes need 3"},
        {"setAttr c.interpolation spline; setAttr c.keyOutTangents 1 2 3 4",
         "keyOutTangents has 4 values; 3 keyTimes need 3"},
        {"setAttr c.interpolation 3", "interpolation is 3, which stands for none (0 to 2)"},
    };
    const std::string good = "setAttr c.keyTimes 1 3 7; setAttr c.keyValues 10 20 -4; setAttr c.interpolation linear;"
                             "setAttr c.keyInTangents 9 2 -1; setAttr c.keyOutTangents 3 0.5 8";
    for (const Row& row : rows) {
        run(good);
        EXPECT_EQ(at(2), 15.0);
        run(row.script);
        expectFailure("c.output", row.problem);
        run("setAttr c.time 3");
        expectFailure("c.output", row.problem); // the second time too
        EXPECT_EQ(number("c.output"), 15.0);
    }
    run(good);
    setList("c.keyValues", {1, 2, std::numeric_limits<double>::infinity()});
    expectFailure("c.output", "keyValues[2] is inf");
}

class AnimCurveQuaternion : public RigTest {
protected:
    AnimCurveQuaternion() { run("createNode animCurveQuaternion -name q"); }

    static HEulerRotation at(double time) {
        run("setAttr q.time " + OpenQuarn::printedValue(time));
        return {number("q.outputRotateX"), number("q.outputRotateY"), number("q.outputRotateZ")};
    }
};

TEST_F(AnimCurveQuaternion, TurnsAtConstantSpeedByTheShorterWay) {
    const double angle = 2.0;
    const HQuaternion end(angle, {0, 0, 1});
    for (const double sign : {3.0, -3.0}) { // of any length, and its negative is the same rotation
        setList("q.keyTimes", {0, 4});
        setList("q.keyValues", {0, 0, 0, 1, 0, 0, sign * end.z, sign * end.w});
        for (const double time : {-1.0, 0.0, 1.0, 2.0, 3.0, 4.0, 9.0}) {
            const double expected = angle * std::clamp(time / 4, 0.0, 1.0);
            EXPECT_TRUE(at(time).isEquivalent({0, 0, expected}, 1e-12)) << time;
        }
    }
    run("setAttr q.interpolation step");
    EXPECT_TRUE(at(3.9).isEquivalent({}, 1e-12));
}

TEST_F(AnimCurveQuaternion, SplinesGoThroughTheirKeysAndGiveEveryOrder) {
    const HQuaternion first(0.4, {1, 2, 3}), last(1.3, {-1, 0.5, 2});
    setList("q.keyTimes", {0, 2});
    setList("q.keyValues", {first.x, first.y, first.z, first.w, last.x, last.y, last.z, last.w});
    setList("q.keyInTangents", {0, 0, 0, 0, 0.1, -0.2, 0.3, 0.4});
    setList("q.keyOutTangents", {0.5, 0.25, -0.5, 0.1, 0, 0, 0, 0});
    run("setAttr q.interpolation spline");
    EXPECT_TRUE(at(0).asQuaternion().isEquivalent(first, 1e-12));
    EXPECT_TRUE(at(2).asQuaternion().isEquivalent(last, 1e-12));
    // in the middle: half of both, and an eighth of the difference of the slopes times the duration
    const HQuaternion middle(
        (first.x + last.x) / 2 + 2 * (0.5 - 0.1) / 8, (first.y + last.y) / 2 + 2 * (0.25 + 0.2) / 8,
        (first.z + last.z) / 2 + 2 * (-0.5 - 0.3) / 8, (first.w + last.w) / 2 + 2 * (0.1 - 0.4) / 8);
    for (int order = 0; order < 6; ++order) {
        run("setAttr q.rotateOrder " + std::to_string(order));
        HEulerRotation angles = at(1);
        angles.order = static_cast<HEulerRotation::RotationOrder>(order);
        EXPECT_TRUE(angles.asMatrix().isEquivalent(middle.asMatrix(), 1e-12)) << order;
    }
}

TEST_F(AnimCurveQuaternion, DrivesAJointAndRefusesDamage) {
    setList("q.keyTimes", {0});
    setList("q.keyValues", {0, std::sqrt(0.5), 0, std::sqrt(0.5)});
    run("createNode joint -name j; connectAttr q.outputRotate j.rotate");
    EXPECT_NEAR(number("j.rotateY"), std::numbers::pi / 2, 1e-12);
    EXPECT_NEAR(matrix("j.matrix")(0, 2), -1.0, 1e-12);
    setList("q.keyValues", {0, 0, 1});
    expectFailure("q.outputRotate", "keyValues has 3 values; 1 keyTimes need 4");
    setList("q.keyTimes", {-1, 1});
    setList("q.keyValues", {0, 0, 0, 1, 0, 0, 0, 0});
    expectFailure("q.outputRotate", "the quaternion of key 1 (keyValues[4] and the three after it) has the length 0: "
                                    "it is no rotation");
}

} // namespace
