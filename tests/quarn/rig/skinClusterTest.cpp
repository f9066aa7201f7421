// SPDX-License-Identifier: Apache-2.0
#include "host/support/testDeformers.h"
#include "quarn/rig/RigTest.h"

namespace {

/// Two grids of four vertices. The joint at x = 1, index 5, turns; the one at index 2 stays.
class SkinCluster : public RigTest {
protected:
    SkinCluster() {
        run("createNode skinCluster -name s; createNode joint -name still; createNode joint -name turned;"
            "setAttr turned.translateX 1; connectAttr still.worldMatrix s.matrix[2];"
            "connectAttr turned.worldMatrix s.matrix[5];"
            "setAttr s.bindPreMatrix[5] 1 0 0 0  0 1 0 0  0 0 1 0  -1 0 0 1");
        for (const std::string index : {"0", "3"}) {
            testDeformers::meshNode("mesh" + index, testDeformers::grid(2, 2, index == "0" ? 0.0 : 7.0));
            run("connectAttr mesh" + index + ".outMesh s.input[" + index + "].inputGeometry");
        }
        bind("0", "1 2 0 1", "5 2 5 5", "1 1 3 0.5");
        bind("3", "0 0 1 1", "2 2", "1 1");
    }

    static void bind(const std::string& geometry, const std::string& counts, const std::string& influences,
                     const std::string& weights) {
        const std::string skin = "setAttr s.skin[" + geometry + "].";
        run(skin + "influenceCounts " + counts + ';' + skin + "influences " + influences + ';' + skin + "skinWeights " +
            weights);
    }
    static std::vector<HPoint> deformed(const std::string& geometry = "0") {
        return testDeformers::points(testNodes::plug("s.outputGeom[" + geometry + "]"));
    }
    static std::vector<HPoint> original(double depth = 0.0) {
        return {{0, 0, depth}, {1, 0, depth}, {0, 1, depth}, {1, 1, depth}};
    }

    const std::string halfTurn = "setAttr turned.translateY 1; setAttr turned.rotateZ 3.141592653589793;";
    // about (1, 0), then up by one: (x, y) becomes (2 - x, 1 - y)
    const std::vector<HPoint> turnedPoints{{2, 1, 0}, {1, 0.75, 0}, {0, 1, 0}, {1, 0, 0}};

    static void expectNear(const std::vector<HPoint>& points, const std::vector<HPoint>& expected) {
        ASSERT_EQ(points.size(), expected.size());
        for (std::size_t i = 0; i < points.size(); ++i)
            EXPECT_TRUE(points[i].isEquivalent(expected[i], 1e-12))
                << i << ": " << points[i].x << ' ' << points[i].y << ' ' << points[i].z;
    }
};

TEST_F(SkinCluster, BlendsJointsByTheirWeights) {
    EXPECT_EQ(deformed(), original()); // the bind pose
    run(halfTurn);
    expectNear(deformed(), turnedPoints);
    EXPECT_EQ(deformed("3"), original(7));

    run("setAttr s.normalize off"); // vertex 1 has 1 and 3, vertex 3 has 0.5
    expectNear(deformed(), {{2, 1, 0}, {4, 3, 0}, {0, 1, 0}, {0.5, 0, 0}});
    run("setAttr s.normalize on; setAttr s.envelope 0.5; setAttr s.weightList[0].weights[3] 0.5");
    expectNear(deformed(), {{1, 0.5, 0}, {1, 0.375, 0}, {0, 1, 0}, {1, 0.75, 0}});
    run("setAttr s.envelope 0");
    EXPECT_EQ(deformed(), original());
}

TEST_F(SkinCluster, FollowsItsListsAndJoints) {
    run(halfTurn);
    deformed();
    bind("0", "0 0 0 1", "5", "1"); // lists that were kept are let go
    expectNear(deformed(), {{0, 0, 0}, {1, 0, 0}, {0, 1, 0}, {1, 0, 0}});
    run("setAttr s.bindPreMatrix[5] 1 0 0 0  0 1 0 0  0 0 1 0  0 0 0 1");
    expectNear(deformed(), {{0, 0, 0}, {1, 0, 0}, {0, 1, 0}, {0, 0, 0}});
    const unsigned before = OpenQuarn::computeCount(testNodes::plug("s.outputGeom").node());
    deformed();
    EXPECT_EQ(OpenQuarn::computeCount(testNodes::plug("s.outputGeom").node()), before);
    bind("0", "", "", "");
    EXPECT_EQ(deformed(), original()); // bound to nothing
    run("connectAttr mesh3.outMesh s.input[9].inputGeometry");
    EXPECT_EQ(deformed("9"), original(7)); // nobody has bound it
}

TEST_F(SkinCluster, AffectsTheVerticesOfItsTag) {
    const HObject tagged = testDeformers::withTag(testDeformers::grid(2, 2), "part", HUintArray{3, 1});
    EXPECT_EQ(testNodes::text(testNodes::plug("mesh0.inMesh").setHObject(tagged)), "");
    run(halfTurn + "setAttr s.input[0].componentTagExpression part");
    expectNear(deformed(), {{0, 0, 0}, turnedPoints[1], {0, 1, 0}, turnedPoints[3]});
}

TEST_F(SkinCluster, DamageLeavesTheGeometryAndSaysWhere) {
    struct Row {
        const char *counts, *influences, *weights, *problem;
    };
    const Row rows[] = {
        {"1 1 1", "5 5 5", "1 1 1", "influenceCounts has 3 values; the geometry has 4 vertices"},
        {"1 1 1 1 1", "5 5 5 5 5", "1 1 1 1 1", "influenceCounts has 5 values; the geometry has 4 vertices"},
        {"1 1 1 1", "5 5 5", "1 1 1 1", "influences has 3 values; the influenceCounts add up to 4"},
        {"1 1 1 1", "5 5 4 5", "1 1 1 1", "an influence is 4, but there is no matrix[4]"},
        {"1 1 1 1", "5 5 4294967295 5", "1 1 1 1", "an influence is 4294967295, but there is no matrix[4294967295]"},
        {"1 1 1 1", "5 5 8 5", "1 1 1 1", "matrix[8] holds no matrix"},
    };
    run(halfTurn + "createNode skinCluster -name none; connectAttr none.matrix[0] s.matrix[8]");
    for (const Row& row : rows) {
        bind("0", row.counts, row.influences, row.weights);
        for (int frame = 0; frame < 2; ++frame) { // what was found out is kept, and said again
            run("dgdirty s");
            expectFailure("s.outputGeom[0]", std::string("geometry 0: ") + row.problem);
            EXPECT_EQ(deformed(), original()) << row.problem;
        }
        EXPECT_EQ(deformed("3"), original(7)) << row.problem;
    }
    bind("0", "1 2 0 1", "5 2 5 5", "1 1 3 0.5");
    expectNear(deformed(), turnedPoints);
}

TEST_F(SkinCluster, IsTheSameInParallelAndFromAFile) {
    run("setAttr turned.rotateX 0.7; setAttr turned.rotateZ 1.1; setAttr turned.scaleY 1.3");
    bind("3", "2 2 2 2", "5 2 2 5 5 2 2 5", "0.1 0.7 0.3 0.3 0.9 0.2 0.123456789012345678 1");
    HPlugArray both;
    for (const char* name : {"s.outputGeom[0]", "s.outputGeom[3]"})
        both.push_back(testNodes::plug(name));
    EXPECT_FALSE(OpenQuarn::evaluate(both, false).error());
    const auto first = deformed("0"), second = deformed("3");
    EXPECT_NE(second, original(7));
    for (int round = 0; round < 50; ++round) {
        run("dgdirty turned; dgdirty s"); // both ask for the same joint
        ASSERT_FALSE(OpenQuarn::evaluate(both, true).error());
        ASSERT_EQ(deformed("0"), first);
        ASSERT_EQ(deformed("3"), second);
    }
    saveAndOpen();
    EXPECT_EQ(deformed("0"), first);
    EXPECT_EQ(deformed("3"), second);
}

} // namespace
