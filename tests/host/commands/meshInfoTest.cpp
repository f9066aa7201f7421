// SPDX-License-Identifier: Apache-2.0
#include "host/support/SceneTest.h"

#include "openquarn/HFnMeshData.h"
#include "openquarn_app/Commands.h"

namespace {

class MeshInfo : public SceneTest {
protected:
    static void makeMesh(const char* name, const HPointArray& points) {
        HFnMeshData mesh;
        mesh.create(points, HIntArray{3}, HIntArray{0, 1, 2});
        testNodes::create("mesh", name);
        EXPECT_EQ(testNodes::text(testNodes::plug(std::string(name) + ".inMesh").setHObject(mesh.object())), "");
    }
    static std::string answer(const char* command) {
        const OpenQuarn::CommandOutcome outcome = OpenQuarn::runCommand(command);
        return outcome ? OpenQuarn::printedValue(outcome.result) : outcome.error;
    }
};

TEST_F(MeshInfo, GivesSizeAndDistance) {
    makeMesh("a", {HPoint(0, 0, 0), HPoint(1, 0, 0), HPoint(0, -2, 0.5)});
    makeMesh("b", {HPoint(0, 0, 0), HPoint(1, 3, 4), HPoint(0, -2, 1.5)});
    makeMesh("larger", HPointArray(4));
    testNodes::create("mesh", "hollow");
    EXPECT_EQ(answer("meshInfo a.outMesh"), "3 vertices, 1 polygon, from 0 -2 0 to 1 0 0.5");
    EXPECT_EQ(answer("meshInfo -to b.outMesh a.outMesh"), "mean distance 2, largest 5 at vertex 1");
    EXPECT_THAT(answer("meshInfo -to larger.outMesh a.outMesh"), ::testing::HasSubstr("3 vertices"));
    EXPECT_THAT(answer("meshInfo hollow.outMesh"), ::testing::HasSubstr("'hollow.outMesh' holds no mesh"));
    EXPECT_THAT(answer("meshInfo time1.outTime"), ::testing::HasSubstr("'time1.outTime' holds no mesh"));
}

} // namespace
