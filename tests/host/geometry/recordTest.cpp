// SPDX-License-Identifier: Apache-2.0
// The scene of record: what it is, and that several threads give the same bits as one.
#include "host/geometry/FilterTest.h"
#include "host/support/recordScene.h"

#include "openquarn/HFnMesh.h"
#include "openquarn_app/SceneFile.h"

#include <atomic>
#include <cmath>
#include <cstring>
#include <set>
#include <thread>

namespace {

using namespace testNodes;
using testDeformers::Hooks;

class RecordTest : public FilterTest {
protected:
    /// Something that depends on order, weight and position, differently for each geometry.
    static HStatus twist(HPxDeformerNode& node, HDataBlock& block, HItGeometry& iterator, unsigned index) {
        HPointArray points;
        HStatus status = iterator.allPositions(points);
        const float* weights = node.envelopeWeights(block, index);
        const double envelope = static_cast<double>(block.inputValue(HPxGeometryFilter::envelope).asFloat());
        const HIndexMapper mapper = node.indexMapper(index);
        for (unsigned i = 0; i < points.length(); ++i) {
            const double weight = envelope * static_cast<double>(weights ? weights[i] : 1.0F);
            const double vertex = mapper.isIdentityMap() ? i : mapper.affectMap()[i];
            points[i].x += weight * std::sin(vertex + points[i].z);
            points[i].z -= weight * 0.01 * (i % 100);
        }
        return status.error() ? status : iterator.setAllPositions(points);
    }

    static std::vector<std::vector<HPoint>> results(const recordScene::Scene& scene) {
        std::vector<std::vector<HPoint>> all;
        for (const HPlug& output : scene.outputs)
            all.push_back(testDeformers::points(output));
        return all;
    }

    static void expectSameBits(const std::vector<HPoint>& a, const std::vector<HPoint>& b) {
        ASSERT_EQ(a.size(), b.size());
        EXPECT_EQ(std::memcmp(a.data(), b.data(), a.size() * sizeof(HPoint)), 0);
    }
};

TEST_F(RecordTest, IsAsItSays) {
    const recordScene::Scene scene = recordScene::build("testDeformer", "testDeformer");
    const std::vector<unsigned> sizes = {1024, 20022, 100172};
    for (std::size_t i = 0; i < sizes.size(); ++i) {
        const HFnMesh mesh(scene.meshes[i]);
        EXPECT_EQ(static_cast<unsigned>(mesh.numVertices()), sizes[i]);
        std::set<unsigned> corners;
        std::vector<bool> used(sizes[i]);
        HIntArray vertices;
        for (int polygon = 0; polygon < mesh.numPolygons(); ++polygon) {
            ASSERT_FALSE(mesh.getPolygonVertices(polygon, vertices).error());
            corners.insert(vertices.length());
            for (const int vertex : vertices)
                used[static_cast<std::size_t>(vertex)] = true;
        }
        EXPECT_EQ(corners, (std::set<unsigned>{3, 4, 6, 8}));
        EXPECT_NE(std::count(used.begin(), used.end(), false), 0) << "vertices in a hole";
    }
    EXPECT_EQ(deformer("firstDeformer").indexMapper(1).affectCount(), 8008U);
    EXPECT_FALSE(deformer("secondDeformer").indexMapper(1).isIdentityMap());
    EXPECT_TRUE(deformer("secondDeformer").indexMapper(4).isIdentityMap());
}

TEST_F(RecordTest, ComesBackFromItsFileWithTheSameBits) {
    Hooks::deform = twist;
    const recordScene::Scene scene = recordScene::build("testDeformer", "testDeformer");
    plug("firstDeformer.envelope").setDouble(0.1);
    EXPECT_EQ(text(OpenQuarn::evaluate(scene.outputs, true)), "");
    const auto before = results(scene);
    std::vector<std::string> names;
    for (const HPlug& output : scene.outputs)
        names.push_back(output.name().asStdString());

    std::string saved, savedAgain;
    ASSERT_EQ(OpenQuarn::sceneToText(saved).error, "");
    session.newScene();
    ASSERT_EQ(OpenQuarn::sceneFromText(saved, "record").error, "");
    for (std::size_t i = 0; i < names.size(); ++i)
        expectSameBits(testDeformers::points(plug(names[i])), before[i]);
    ASSERT_EQ(OpenQuarn::sceneToText(savedAgain).error, "");
    EXPECT_TRUE(saved == savedAgain);
}

TEST_F(RecordTest, ThreadsGiveTheSameBitsAsOne) {
    Hooks::deform = twist;
    const recordScene::Scene scene = recordScene::build("testDeformer", "testDeformer");
    EXPECT_EQ(text(OpenQuarn::evaluate(scene.outputs, false)), "");
    const auto first = results(scene);
    plug("firstDeformer.envelope").setDouble(0.5);
    EXPECT_EQ(text(OpenQuarn::evaluate(scene.outputs, false)), "");
    const auto second = results(scene);
    EXPECT_NE(std::memcmp(first[2].data(), second[2].data(), first[2].size() * sizeof(HPoint)), 0);
    for (int round = 0; round < 6; ++round) {
        plug("firstDeformer.envelope").setDouble(round % 2 == 0 ? 1.0 : 0.5);
        HPlugArray plugs = scene.outputs;
        plugs.push_back(plug("secondDeformer.outputGeom")); // everything, once more, at the same time
        plugs.push_back(plug("firstDeformer.outputGeom"));
        OpenQuarn::ComputeWatch computes;
        EXPECT_EQ(text(OpenQuarn::evaluate(plugs, true)), "");
        for (const std::string& computed : std::set<std::string>(computes.plugs().begin(), computes.plugs().end()))
            EXPECT_EQ(std::count(computes.plugs().begin(), computes.plugs().end(), computed), 1) << computed;
        const auto now = results(scene);
        for (std::size_t i = 0; i < now.size(); ++i)
            expectSameBits(now[i], (round % 2 == 0 ? first : second)[i]);
    }
}

TEST_F(RecordTest, GeometriesOfOneNodeAreDeformedAtTheSameTime) {
    create("testDeformer", "d");
    HPlugArray outputs;
    for (unsigned index = 0; index < 2; ++index) {
        set(input("d", index), testDeformers::grid(4, 4));
        outputs.push_back(plug(output("d", index)));
    }
    std::atomic<int> inside{0};
    std::atomic<bool> met{false};
    Hooks::deform = [&](HPxDeformerNode& node, HDataBlock& block, HItGeometry& iterator, unsigned index) {
        ++inside;
        const auto patience = std::chrono::steady_clock::now() + std::chrono::seconds(10);
        while (!met && std::chrono::steady_clock::now() < patience) {
            if (inside == 2)
                met = true;
            std::this_thread::yield();
        }
        return testDeformers::pushPoints(node, block, iterator, index);
    };
    EXPECT_EQ(text(OpenQuarn::evaluate(outputs, true)), "");
    EXPECT_TRUE(met || std::thread::hardware_concurrency() < 2);
    for (unsigned index = 0; index < 2; ++index)
        EXPECT_THAT(pushed(output("d", index), testDeformers::grid(4, 4)), ::testing::Each(1.0));
}

} // namespace
