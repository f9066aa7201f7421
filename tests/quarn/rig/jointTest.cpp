// SPDX-License-Identifier: Apache-2.0
#include "quarn/rig/RigTest.h"

#include <cmath>

namespace {

class Joint : public RigTest {
protected:
    Joint() { run("createNode joint -name j"); }
};

HMatrix turnAbout(char axis, double angle) {
    const unsigned from = axis == 'x' ? 1 : axis == 'y' ? 2 : 0;
    const unsigned to = (from + 1) % 3;
    HMatrix made;
    made(from, from) = made(to, to) = std::cos(angle);
    made(from, to) = std::sin(angle);
    made(to, from) = -std::sin(angle);
    return made;
}

HMatrix scaling(double x, double y, double z) {
    HMatrix made;
    made(0, 0) = x;
    made(1, 1) = y;
    made(2, 2) = z;
    return made;
}

HMatrix translation(double x, double y, double z) {
    HMatrix made;
    made.setRow(3, {x, y, z});
    return made;
}

const std::string pose = "setAttr j.translateX 1; setAttr j.translateY -2; setAttr j.translateZ 3;"
                         "setAttr j.rotateX 0.3; setAttr j.rotateY -0.8; setAttr j.rotateZ 1.7;"
                         "setAttr j.jointOrientX 0.5; setAttr j.jointOrientY 0.25; setAttr j.jointOrientZ -2;"
                         "setAttr j.scaleX 2; setAttr j.scaleY 0.5; setAttr j.scaleZ -3;";

TEST_F(Joint, IsScaledTurnedOrientedAndMovedInEveryOrder) {
    const HMatrix orient = turnAbout('x', 0.5) * turnAbout('y', 0.25) * turnAbout('z', -2);
    const std::map<char, double> angles{{'x', 0.3}, {'y', -0.8}, {'z', 1.7}};
    run(pose);
    for (const std::string order : {"xyz", "yzx", "zxy", "xzy", "yxz", "zyx"}) {
        run("setAttr j.rotateOrder " + order);
        HMatrix turn;
        for (const char axis : order)
            turn *= turnAbout(axis, angles.at(axis));
        const HMatrix expected = scaling(2, 0.5, -3) * turn * orient * translation(1, -2, 3);
        EXPECT_TRUE(matrix("j.matrix").isEquivalent(expected, 1e-14)) << order;
    }
}

TEST_F(Joint, ChainsAndKnowsItsPoseAgainstRest) {
    run(pose + "createNode joint -name child; connectAttr j.worldMatrix child.parentMatrix;"
               "setAttr child.translateX 5; setAttr child.rotateZ 0.4");
    const HMatrix local = turnAbout('z', 0.4) * translation(5, 0, 0);
    EXPECT_TRUE(matrix("child.worldMatrix").isEquivalent(local * matrix("j.worldMatrix"), 1e-14));
    run("setAttr j.translateX 9");
    EXPECT_TRUE(matrix("child.worldMatrix").isEquivalent(local * matrix("j.matrix"), 1e-14));

    // turned against rest about its own axes
    EXPECT_EQ(matrix("child.relativeMatrix"), matrix("child.matrix"));
    run("setAttr child.restMatrix 1 0 0 0  0 1 0 0  0 0 1 0  5 0 0 1");
    EXPECT_TRUE(matrix("child.relativeMatrix").isEquivalent(turnAbout('z', 0.4), 1e-14));
}

TEST_F(Joint, RefusesWhatHasNoMeaning) {
    run("setAttr j.restMatrix 0 0 0 0  0 1 0 0  0 0 1 0  0 0 0 1");
    expectFailure("j.relativeMatrix", "restMatrix is singular, so that there is no pose relative to it");
    EXPECT_EQ(matrix("j.worldMatrix"), HMatrix()); // which needs no rest
    run("setAttr j.rotateOrder 6");
    expectFailure("j.matrix", "rotateOrder is 6, which is no rotation order (0 to 5)");
}

TEST_F(Joint, EveryInputChangesWhatDependsOnIt) {
    struct Row {
        std::string change;
        bool world, relative;
    };
    std::vector<Row> rows;
    for (const std::string part : {"translate", "rotate", "jointOrient", "scale"})
        for (const std::string axis : {"X", "Y", "Z"})
            rows.push_back({part + axis + " 0.7", true, true});
    rows.push_back({"rotateOrder zyx", true, true});
    rows.push_back({"parentMatrix 1 0 0 0 0 1 0 0 0 0 1 0 4 0 0 1", true, false});
    rows.push_back({"restMatrix 1 0 0 0 0 1 0 0 0 0 1 0 4 0 0 1", false, true});
    for (const Row& row : rows) {
        run("file -new; createNode joint -name j;" + pose);
        const HMatrix world = matrix("j.worldMatrix"), relative = matrix("j.relativeMatrix"), own = matrix("j.matrix");
        run("setAttr j." + row.change);
        EXPECT_EQ(matrix("j.worldMatrix") != world, row.world) << row.change;
        EXPECT_EQ(matrix("j.relativeMatrix") != relative, row.relative) << row.change;
        EXPECT_EQ(matrix("j.matrix") != own, row.world && row.relative) << row.change;
    }
}

} // namespace
