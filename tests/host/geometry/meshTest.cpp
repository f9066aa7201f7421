// SPDX-License-Identifier: Apache-2.0
// Meshes as data: what can be made, component tags, points; iterators on data handles; the mesh node.
#include "host/support/SceneTest.h"
#include "host/support/testDeformers.h"

#include "openquarn/HFnDependencyNode.h"
#include "openquarn/HFnMesh.h"
#include "openquarn/HItGeometry.h"

#include <limits>

namespace {

using namespace testNodes;
using testDeformers::grid;
using ::testing::ElementsAre;
using ::testing::HasSubstr;

class Mesh : public SceneTest {
protected:
    static HPointArray pointsOf(const HObject& mesh) {
        HPointArray points;
        EXPECT_EQ(text(HFnMesh(mesh).getPoints(points)), "");
        return points;
    }
};

TEST_F(Mesh, KeepsPolygonsOfAnySizeAndLooseVertices) {
    HPointArray points;
    for (int i = 0; i < 9; ++i)
        points.append(HPoint(i, 10 * i, -i, 3.0));
    const std::vector<std::vector<int>> polygons = {{0, 1, 2}, {7, 6, 5, 4, 3, 2, 1}, {2, 3, 0, 3}, {5, 6}};
    HIntArray counts, connects;
    for (const std::vector<int>& polygon : polygons) {
        counts.append(static_cast<int>(polygon.size()));
        for (const int vertex : polygon)
            connects.append(vertex);
    }
    HStatus status;
    HFnMeshData data;
    const HObject object = data.create(points, counts, connects, &status);
    ASSERT_EQ(text(status), "");
    EXPECT_EQ(data.object(), object);
    EXPECT_EQ(HFnData(object).dataType(), 14);
    const HFnMesh mesh(object, &status);
    EXPECT_EQ(text(status), "");
    EXPECT_EQ(mesh.numVertices(), 9);
    ASSERT_EQ(mesh.numPolygons(), 4);
    HIntArray vertices;
    for (int polygon = 0; polygon < 4; ++polygon) {
        EXPECT_EQ(text(mesh.getPolygonVertices(polygon, vertices)), "");
        EXPECT_EQ(std::vector<int>(vertices.begin(), vertices.end()), polygons[static_cast<std::size_t>(polygon)]);
    }
    for (const int wrong : {-1, 4})
        EXPECT_EQ(mesh.getPolygonVertices(wrong, vertices), HStatus::kInvalidParameter);
    EXPECT_EQ(pointsOf(object)[8], HPoint(8, 80, -8, 1)) << "w is dropped";
}

struct HostileCase {
    const char* what;
    HIntArray counts;
    HIntArray connects;
    const char* why;
};

TEST_F(Mesh, RefusesWhatIsNoMesh) {
    const HPointArray four(4);
    const std::vector<HostileCase> rows = {
        {"one corner", {3, 1}, {0, 1, 2, 3}, "polygon 1 has 1 vertices: it needs at least 2"},
        {"negative count", {3, -1}, {0, 1, 2}, "polygon 1 has -1 vertices"},
        {"huge count", {2147483647}, {0, 1, 2}, "ends at vertex number 2147483647 of the list"},
        {"counts whose sum would wrap", {2147483647, 2147483647, 5}, {0, 1, 2}, "polygon 0 ends at"},
        {"corners left over", {3}, {0, 1, 2, 3}, "the polygons have 3 vertices, the list of polygon vertices 4"},
        {"corners without polygons", {}, {0}, "the polygons have 0 vertices"},
        {"vertex out of range", {4}, {0, 1, 2, 4}, "polygon vertex number 3 is 4: the mesh has 4 vertices"},
        {"negative vertex", {3}, {0, -1, 2}, "polygon vertex number 1 is -1"},
    };
    for (const HostileCase& row : rows) {
        SCOPED_TRACE(row.what);
        HFnMeshData data(grid(2, 2));
        HStatus status;
        EXPECT_TRUE(data.create(four, row.counts, row.connects, &status).isNull());
        EXPECT_EQ(status, HStatus::kInvalidParameter);
        EXPECT_THAT(text(status), HasSubstr(row.why));
        EXPECT_TRUE(data.object().isNull());
    }
    HStatus status;
    const HObject empty = HFnMeshData().create(HPointArray(), HIntArray(), HIntArray(), &status);
    EXPECT_EQ(text(status), "") << "a mesh may be empty";
    EXPECT_EQ(HFnMesh(empty).numVertices(), 0);
}

TEST_F(Mesh, TagsKeepTheirOrderAndAreChecked) {
    const HObject plain = grid(3, 2);
    HFnMeshData data(plain);
    EXPECT_EQ(text(data.setComponentTag("some", {5, 0, 3})), "");
    EXPECT_EQ(text(data.setComponentTag("none", {})), "");
    const HObject tagged = data.object();
    EXPECT_EQ(text(data.setComponentTag("some", {1})), "");
    HUintArray vertices;
    EXPECT_EQ(text(HFnGeometryData(tagged).getComponentTag("some", vertices)), "");
    EXPECT_THAT(vertices, ElementsAre(5U, 0U, 3U)) << "another mesh than the one that was changed";
    EXPECT_EQ(HFnGeometryData(plain).getComponentTag("some", vertices), HStatus::kFailure);
    HStringArray names;
    EXPECT_EQ(text(HFnGeometryData(tagged).getComponentTags(names)), "");
    EXPECT_THAT(names, ElementsAre(HString("none"), HString("some")));

    EXPECT_THAT(text(data.setComponentTag("high", {0, 6})), HasSubstr("'high' lists vertex 6: the mesh has 6"));
    EXPECT_THAT(text(data.setComponentTag("double", {2, 4, 2})), HasSubstr("'double' lists vertex 2 twice"));
    EXPECT_THAT(text(data.setComponentTag("*", {2})), HasSubstr("'*' cannot name a component tag"));
    EXPECT_THAT(text(data.removeComponentTag("high")), HasSubstr("no component tag 'high'"));
    EXPECT_EQ(text(data.removeComponentTag("some")), "");
    EXPECT_EQ(data.getComponentTag("some", vertices), HStatus::kFailure);
}

TEST_F(Mesh, UVsBelongToCornersAndAreChecked) {
    const HObject plain = testDeformers::withTag(grid(3, 2), "corner", {0}); // two quads
    HFnMesh mesh(plain);
    const HIntArray seam{0, 1, 2, 3, 0, 3, 2, 1};
    EXPECT_EQ(text(mesh.setUVs({0, 1, 1, 0.25F}, {0, 0, 1, 1}, seam)), "");
    const auto expectUvs = [&](const HObject& object) {
        HFloatArray us, vs;
        HIntArray corners;
        EXPECT_EQ(text(HFnMesh(object).getUVs(us, vs, corners)), "");
        EXPECT_THAT(us, ElementsAre(0, 1, 1, 0.25F));
        EXPECT_THAT(vs, ElementsAre(0, 0, 1, 1));
        EXPECT_EQ(corners, seam);
    };
    const HObject textured = mesh.object();
    expectUvs(textured);
    HFnMeshData data(textured);
    EXPECT_EQ(text(data.setComponentTag("more", {1})), "");
    EXPECT_EQ(text(data.removeComponentTag("corner")), "");
    expectUvs(data.object());
    EXPECT_EQ(text(mesh.setPoints(HPointArray(6))), "");
    expectUvs(mesh.object());

    const float none = std::numeric_limits<float>::quiet_NaN();
    const struct {
        HFloatArray us, vs;
        HIntArray corners;
        const char* why;
    } rows[] = {
        {{0, 1}, {0}, seam, "2 times u and 1 times v"},
        {{0, 1}, {0, none}, seam, "UV 1 is not finite"},
        {{0, 1}, {0, 1}, {0, 1, 0}, "UVs for 3 corners: the polygons have 8"},
        {{0, 1, 2}, {0, 1, 2}, seam, "corner 3 has UV 3 of 3"},
        {{0, 1}, {0, 1}, {0, 1, 0, 0, -1, 0, 0, 0}, "corner 4 has UV -1"},
    };
    for (const auto& row : rows)
        EXPECT_THAT(text(mesh.setUVs(row.us, row.vs, row.corners)), HasSubstr(row.why));
    expectUvs(mesh.object());
    EXPECT_EQ(text(mesh.setUVs({}, {}, {})), "");
    HFloatArray us(1), vs(1);
    HIntArray corners(1);
    EXPECT_EQ(text(mesh.getUVs(us, vs, corners)), "");
    EXPECT_EQ(us.length() + vs.length() + corners.length(), 0U);
}

TEST_F(Mesh, PointsAreSetOnANewMesh) {
    const HObject before = testDeformers::withTag(grid(3, 3), "corner", {0});
    HFnMesh mesh(before);
    EXPECT_THAT(text(mesh.setPoints(HPointArray(8))), HasSubstr("of 9 vertices cannot have 8 points"));
    EXPECT_EQ(mesh.object(), before);
    HPointArray moved = pointsOf(before);
    moved[4] = HPoint(7, 8, 9);
    EXPECT_EQ(text(mesh.setPoints(moved)), "");
    EXPECT_EQ(pointsOf(before)[4], HPoint(1, 1, 0));
    EXPECT_EQ(pointsOf(mesh.object()), moved);
    EXPECT_EQ(mesh.numPolygons(), 4);
    HUintArray tag;
    EXPECT_EQ(text(HFnGeometryData(mesh.object()).getComponentTag("corner", tag)), "");
}

TEST_F(Mesh, NodesBringTheirInputToTheirOutput) {
    const HObject node = create("mesh", "m");
    HStatus status;
    HFnMesh mesh(node, &status);
    EXPECT_THAT(text(status), HasSubstr("'m' holds no mesh"));
    EXPECT_EQ(mesh.numVertices(&status), 0);
    EXPECT_EQ(status, HStatus::kInvalidParameter);
    const HObject data = grid(4, 3);
    EXPECT_EQ(text(plug("m.inMesh").setHObject(data)), "");
    EXPECT_EQ(HFnMesh(node, &status).object(), data);
    EXPECT_EQ(text(status), "");
    EXPECT_EQ(plug("m.outMesh").asHDataHandle().type(), 14);
    EXPECT_THAT(text(plug("m.inMesh").setHObject(HFnStringData().create("no"))), HasSubstr("cannot hold"));
    for (const HObject& wrong : {HObject(), create("testSum"), HFnStringData().create("no")}) {
        HFnMesh set(wrong, &status);
        EXPECT_EQ(status, HStatus::kInvalidParameter);
        HFnGeometryData geometry(wrong, &status);
        EXPECT_EQ(status, HStatus::kInvalidParameter);
    }
}

TEST_F(Mesh, IteratorsVisitAllVerticesAndWriteIntoTheHandle) {
    const HObject original = grid(5, 4);
    testDeformers::meshNode("m", original);
    HDataHandle handle = plug("m.inMesh").asHDataHandle();
    HPointArray points;
    {
        HStatus status;
        HItGeometry iterator(handle, &status);
        EXPECT_EQ(text(status), "");
        EXPECT_EQ(iterator.count(), 20U);
        for (; !iterator.isDone(); iterator.next()) {
            EXPECT_EQ(iterator.position(), pointsOf(original)[iterator.index()]);
            EXPECT_EQ(text(iterator.setPosition(iterator.position(HSpace::kWorld) * 2.0)), "");
        }
        EXPECT_EQ(iterator.setPosition(HPoint()), HStatus::kFailure);
        iterator.position(HSpace::kObject, &status);
        EXPECT_EQ(status, HStatus::kFailure);
        EXPECT_EQ(text(iterator.allPositions(points)), "");
        EXPECT_EQ(iterator.allPositions(points, HSpace::kInvalid), HStatus::kInvalidParameter);
        EXPECT_THAT(text(iterator.setAllPositions(HPointArray(19))), HasSubstr("on 20 vertices cannot set 19"));
    }
    EXPECT_EQ(pointsOf(handle.asMesh()), points);
    EXPECT_EQ(points[19], HPoint(8, 6, 0));
    EXPECT_EQ(pointsOf(original)[19], HPoint(4, 3, 0)) << "the mesh itself stays";
    HItGeometry iterator(handle);
    points[3] = HPoint(1, 2, 3);
    EXPECT_EQ(text(iterator.setAllPositions(points)), "");
    EXPECT_EQ(pointsOf(handle.asMesh()), points) << "at once";

    HStatus status;
    {
        HItGeometry raw(handle);
        const double* from = raw.rawPositions();
        double* to = raw.rawPositionsToSet(&status);
        EXPECT_EQ(text(status), "");
        for (std::size_t i = 0; i < 60; ++i)
            to[i] = from[i] + 1.0;
        EXPECT_EQ(pointsOf(handle.asMesh()), points) << "not yet";
    }
    EXPECT_EQ(pointsOf(handle.asMesh())[3], HPoint(2, 3, 4));

    HItGeometry nothing{HDataHandle(), &status};
    EXPECT_EQ(status, HStatus::kInvalidParameter);
    EXPECT_TRUE(nothing.isDone());
    EXPECT_EQ(nothing.allPositions(points), HStatus::kInvalidParameter);
    EXPECT_EQ(nothing.rawPositionsToSet(&status), nullptr);
    EXPECT_EQ(status, HStatus::kInvalidParameter);
    const HIndexMapper mapper;
    EXPECT_TRUE(mapper.isIdentityMap());
    EXPECT_TRUE(mapper.affectMap().isEmpty());
}

} // namespace
