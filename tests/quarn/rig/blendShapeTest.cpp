// SPDX-License-Identifier: Apache-2.0
#include "host/support/testDeformers.h"
#include "quarn/rig/RigTest.h"

namespace {

/// Two grids of four vertices; shapes 0, 1 and 4 of the first, shape 0 of the other one.
class BlendShape : public RigTest {
protected:
    BlendShape() {
        run("createNode blendShape -name b; setAttr b.weight 0 0");
        for (const std::string index : {"0", "3"}) {
            testDeformers::meshNode("mesh" + index, testDeformers::grid(2, 2, index == "0" ? 0.0 : 7.0));
            run("connectAttr mesh" + index + ".outMesh b.input[" + index + "].inputGeometry");
        }
        setShape("0", "0", "2 0", "0 0 1  4 0 0"); // in any order
        setShape("0", "1", "", "0 1 0  0 2 0  0 3 0  0 4 0");
        setShape("0", "4", "3", "0 0 8");
        setShape("3", "0", "1", "0 0 -7");
    }

    static void setShape(const std::string& geometry, const std::string& shape, const std::string& vertices,
                         const std::string& deltas) {
        const std::string name = "setAttr b.shapes[" + geometry + "].shape[" + shape + "].";
        run(name + "vertices " + vertices + ';' + name + "deltas " + deltas);
    }
    static std::vector<HPoint> deformed(const std::string& geometry = "0") {
        return testDeformers::points(testNodes::plug("b.outputGeom[" + geometry + "]"));
    }
    static std::vector<HPoint> original(double depth = 0.0) {
        return {{0, 0, depth}, {1, 0, depth}, {0, 1, depth}, {1, 1, depth}};
    }
    /// x of vertex 0, which shape 0 moves by four, and z of vertex 3, which shape 4 moves by eight.
    static std::pair<double, double> weights() {
        const std::vector<HPoint> points = deformed();
        return {points[0].x / 4, points[3].z / 8};
    }
};

TEST_F(BlendShape, AddsShapesByTheirWeights) {
    EXPECT_EQ(deformed(), original());
    run("setAttr b.weight 0.5 2");
    EXPECT_EQ(deformed(), (std::vector<HPoint>{{2, 2, 0}, {1, 4, 0}, {0, 7, 0.5}, {1, 9, 0}}));
    EXPECT_EQ(deformed("3"), (std::vector<HPoint>{{0, 0, 7}, {1, 0, 3.5}, {0, 1, 7}, {1, 1, 7}}));
    run("setAttr b.envelope 0.5; setAttr b.weightList[0].weights[3] 0.25");
    EXPECT_EQ(deformed(), (std::vector<HPoint>{{1, 1, 0}, {1, 2, 0}, {0, 4, 0.25}, {1, 2, 0}}));
    saveAndOpen();
    EXPECT_EQ(deformed(), (std::vector<HPoint>{{1, 1, 0}, {1, 2, 0}, {0, 4, 0.25}, {1, 2, 0}}));
    run("setAttr b.envelope 0");
    EXPECT_EQ(deformed(), original());
}

TEST_F(BlendShape, FollowsItsListsAndElements) {
    run("setAttr b.weight 1 0 0 0 1");
    deformed();
    setShape("0", "0", "1", "0 0 5"); // lists that were kept are let go
    setShape("0", "2", "0", "9 9 9"); // and those behind a new element move on
    EXPECT_EQ(deformed(), (std::vector<HPoint>{{0, 0, 0}, {1, 0, 5}, {0, 1, 0}, {1, 1, 8}}));
    run("setAttr b.shapes[0].shape[4].deltas 0 0 3; setAttr b.shapes[0].shape[0].vertices 2"); // one of the two
    EXPECT_EQ(deformed(), (std::vector<HPoint>{{0, 0, 0}, {1, 0, 0}, {0, 1, 5}, {1, 1, 3}}));
    run("setAttr b.weight[2] 1; setAttr b.weight[4] 0");
    EXPECT_EQ(deformed(), (std::vector<HPoint>{{9, 9, 9}, {1, 0, 0}, {0, 1, 5}, {1, 1, 0}}));
}

TEST_F(BlendShape, AffectsTheVerticesOfItsTag) {
    const HObject tagged = testDeformers::withTag(testDeformers::grid(2, 2), "part", HUintArray{3, 0});
    EXPECT_EQ(testNodes::text(testNodes::plug("mesh0.inMesh").setHObject(tagged)), "");
    run("setAttr b.weight 0 1; setAttr b.input[0].componentTagExpression part");
    EXPECT_EQ(deformed(), (std::vector<HPoint>{{0, 1, 0}, {1, 0, 0}, {0, 1, 0}, {1, 5, 0}}));
}

TEST_F(BlendShape, CombinesWeights) {
    struct Row {
        const char *factors, *ramps;
        double first, second, combined;
    };
    const Row rows[] = {
        {"0 1", "", 0.5, 0.5, 0.25},  {"1", "", 0.5, -2, -2},
        {"0 0 1", "", 0.5, 3, 0.75},  {"0", "0 0.5 1", 0.25, 0, 0.5},   // an in-between: up ...
        {"0", "0 0.5 1", 0.5, 0, 1},  {"0", "0 0.5 1", 0.875, 0, 0.25}, // ... and down
        {"0", "0 0.5 1", 1.5, 0, 0},  {"0", "0 0.5 1", -0.5, 0, 0},
        {"0", "0.5 1 1", 0.25, 0, 0},                                 // the peak at the end: goes on
        {"0", "0.5 1 1", 1.5, 0, 2},  {"0", "-1 -1 0", -1.5, 0, 1.5}, // at the begin
        {"0", "-1 -1 0", 0.5, 0, 0},  {"0 1", "0 0.5 1 0 1 1", 0.25, 0.5, 0.25},
    };
    for (const Row& row : rows) {
        run("setAttr b.combination[4].factors " + std::string(row.factors) + ";setAttr b.combination[4].ramps " +
            row.ramps + ";setAttr b.weight " + std::to_string(row.first) + ' ' + std::to_string(row.second));
        EXPECT_EQ(weights(), std::pair(row.first, row.combined)) << row.factors << " by " << row.ramps;
    }
    run("setAttr b.weight[4] 7"); // is not looked at, while there are factors
    EXPECT_EQ(weights().second, 0.25);
    run("setAttr b.combination[4].factors; setAttr b.combination[4].ramps");
    EXPECT_EQ(weights().second, 7);
}

TEST_F(BlendShape, DamageLeavesTheGeometryAndSaysWhere) {
    const std::string whole = ", not a whole number from 0 to 4294967295";
    const struct {
        std::string vertices, deltas, problem;
    } shapes[] = {
        {"4", "0 0 1", "it moves vertex 4; the geometry has 4 vertices"},
        {"", "0 0 0 0 0 0 0 0 0 0 0 0 0 0 0", "it moves vertex 4; the geometry has 4 vertices"},
        {"1 2 1", "0 0 0 0 0 0 0 0 0", "vertices has 1 twice"},
        {"1 -2", "0 0 0 0 0 0", "vertices[1] is -2" + whole},
        {"1 0.5", "0 0 0 0 0 0", "vertices[1] is 0.5" + whole},
        {"4294967296", "0 0 0", "vertices[0] is 4294967296" + whole},
        {"1", "0 0", "deltas has 2 values, not three for each vertex"},
        {"1 2", "0 0 0", "deltas has 3 values; the 2 vertices need 6"},
    };
    for (const auto& row : shapes) {
        setShape("0", "1", row.vertices, row.deltas);
        for (int frame = 0; frame < 2; ++frame) { // what was found out is kept, and said again
            run("dgdirty b");
            expectFailure("b.outputGeom[0]", "geometry 0: shape[1]: " + row.problem);
        }
        EXPECT_EQ(deformed(), original()) << row.problem;
        EXPECT_EQ(deformed("3"), original(7)) << row.problem;
    }
    setShape("0", "1", "", "");
    const struct {
        std::string factors, ramps, problem;
    } combinations[] = {
        {"0 9", "", "factors[1] is 9, but there is no weight[9]"},
        {"0 0.5", "", "factors[1] is 0.5" + whole},
        {"4 4", "", "factors[0] is 4, a shape that is combined itself"},
        {"0 1", "0 1 1", "ramps has 3 values; the 2 factors need 6 or none"},
        {"0", "0 1 0.5", "the ramp of factors[0] is 0 1 0.5, not begin, peak and end in this order"},
        {"0", "1 1 1", "the ramp of factors[0] is 1 1 1, not begin, peak and end in this order"},
    };
    for (const auto& row : combinations) {
        run("setAttr b.combination[4].factors " + row.factors + ";setAttr b.combination[4].ramps " + row.ramps);
        expectFailure("b.outputGeom[0]", "geometry 0: combination[4]: " + row.problem);
        takeMessages();
    }
}

} // namespace
