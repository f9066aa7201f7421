// SPDX-License-Identifier: Apache-2.0
// Several threads give the same bits as one.
#include "host/geometry/FilterTest.h"

#include <atomic>
#include <cmath>
#include <cstring>
#include <set>
#include <thread>

namespace {

using namespace testNodes;
using testDeformers::Hooks;

class FilterThreads : public FilterTest {
protected:
    /// Something that depends on order, weight and position, differently for each geometry.
    static HStatus twist(HPxDeformerNode& node, HDataBlock& block, HItGeometry& iterator, unsigned index) {
        if (index == 4 && node.name() == HString("second"))
            return testDeformers::pushRawPoints(node, block, iterator, index);
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

    /// Three geometries through two deformers, large enough for threads to matter: of the second, every other vertex is
    /// affected, the last one first; the third has some weights.
    void build() {
        for (const char* name : {"first", "second"})
            create("testDeformer", name);
        for (const auto& [geometry, columns] : {std::pair{0U, 32U}, std::pair{1U, 142U}, std::pair{4U, side}}) {
            HUintArray patch;
            for (unsigned vertex = columns * columns; vertex > 0; vertex -= 2)
                patch.append(vertex - 1);
            const std::string mesh = "mesh" + std::to_string(geometry);
            testDeformers::meshNode(mesh,
                                    testDeformers::withTag(testDeformers::grid(columns, columns), "patch", patch));
            connect(mesh + ".outMesh", input("first", geometry));
            connect(output("first", geometry), input("second", geometry));
            outputs.push_back(plug(output("second", geometry)));
        }
        for (const std::string deformer : {"first", "second"}) {
            plug(deformer + ".input[1].componentTagExpression").setString("patch");
            const HPlug weights = plug(deformer + ".weightList[4].weights");
            for (unsigned vertex = 0; vertex < side * side; vertex += deformer == "first" ? 3U : 5U)
                weights.elementByLogicalIndex(vertex).setDouble(0.25 + 0.5 * (vertex % 7) / 7.0);
        }
    }

    std::vector<std::vector<HPoint>> results() const {
        std::vector<std::vector<HPoint>> all;
        for (const HPlug& output : outputs)
            all.push_back(testDeformers::points(output));
        return all;
    }

    static void expectSameBits(const std::vector<HPoint>& a, const std::vector<HPoint>& b) {
        ASSERT_EQ(a.size(), b.size());
        EXPECT_EQ(std::memcmp(a.data(), b.data(), a.size() * sizeof(HPoint)), 0);
    }

    static constexpr unsigned side = 316;
    HPlugArray outputs;
};

TEST_F(FilterThreads, GiveTheSameBitsAsOne) {
    Hooks::deform = twist;
    build();
    EXPECT_EQ(text(OpenQuarn::evaluate(outputs, false)), "");
    const auto first = results();
    plug("first.envelope").setDouble(0.5);
    EXPECT_EQ(text(OpenQuarn::evaluate(outputs, false)), "");
    const auto second = results();
    EXPECT_NE(std::memcmp(first[2].data(), second[2].data(), first[2].size() * sizeof(HPoint)), 0);
    for (int round = 0; round < 6; ++round) {
        plug("first.envelope").setDouble(round % 2 == 0 ? 1.0 : 0.5);
        HPlugArray plugs = outputs;
        plugs.push_back(plug("second.outputGeom")); // everything, once more, at the same time
        plugs.push_back(plug("first.outputGeom"));
        OpenQuarn::ComputeWatch computes;
        EXPECT_EQ(text(OpenQuarn::evaluate(plugs, true)), "");
        for (const std::string& computed : std::set<std::string>(computes.plugs().begin(), computes.plugs().end()))
            EXPECT_EQ(std::count(computes.plugs().begin(), computes.plugs().end(), computed), 1) << computed;
        const auto now = results();
        for (std::size_t i = 0; i < now.size(); ++i)
            expectSameBits(now[i], (round % 2 == 0 ? first : second)[i]);
    }
}

TEST_F(FilterThreads, GeometriesOfOneNodeAreDeformedAtTheSameTime) {
    create("testDeformer", "d");
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
