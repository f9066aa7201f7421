// SPDX-License-Identifier: Apache-2.0
#include "KernelTest.h"
#include "support/indexMaps.h"
#include "support/meshZoo.h"

#include "quill/VertexConnections.h"

namespace {

using QuillKernels = KernelTest;

TEST_F(QuillKernels, GatheringTakesTheMappedPointsOrAll) {
    const kernels::Program program(*device(), "quillBuffers.cl", false);
    Dice dice(1);
    for (const std::size_t n : oddSizes) {
        const Points points = randomPoints(dice, n + 7);
        const Indices subset = dice.chosen(n, points.size());
        for (const Indices* map : {static_cast<const Indices*>(nullptr), &subset}) {
            Points expected(n);
            for (std::size_t i = 0; i < n; ++i)
                expected[i] = points[map ? (*map)[i] : i];
            Launch launch(program, "copyToAffectBuffer");
            launch.output(Points(n)).input(points).input(map).value(static_cast<std::uint32_t>(n));
            EXPECT_TRUE(same(launch.run(n), expected)) << n;
        }
    }
}

struct Smoothing {
    float step = 1.0F;
    const std::vector<std::uint8_t>* mask = nullptr;
};

// The passes alternate between two buffers that both begin with the points.
Points smoothOnDevice(const kernels::Program& program, const quill::VertexConnections& connections,
                      const std::vector<float>& weights, Points points, std::size_t passes, const Smoothing& settings) {
    Points other = points;
    for (std::size_t pass = 0; pass < passes; ++pass) {
        Launch launch(program, "averageVertKernel");
        launch.output(other).input(points);
        if (settings.mask)
            launch.input(settings.mask);
        else
            launch.value(std::uint64_t{0}); // how the deformer says it: eight bytes of zero
        launch.value(settings.step)
            .input(connections.connectionsIndexer())
            .input(connections.connections())
            .input(weights)
            .value(static_cast<std::uint32_t>(points.size()));
        other = std::exchange(points, launch.run(points.size()));
    }
    return points;
}

TEST_F(QuillKernels, SmoothingGivesTheBitsOfTheProcessor) {
    const kernels::Program program(*device(), "quillUtils.cl", true);
    Dice dice(2);
    auto meshes = meshZoo();
    for (const std::size_t n : oddSizes)
        meshes.push_back({"strip of " + std::to_string(n), strip(n), randomPoints(dice, n)});
    for (const ZooMesh& mesh : meshes)
        for (const auto& [mapName, map] : indexMaps(mesh.vertexCount())) {
            const Points points = affectedPoints(mesh.points, map);
            if (points.empty())
                continue; // nothing is launched then
            quill::VertexConnections connections;
            connections.build(mesh.topology(), map, 0, false);
            std::vector<float> weights;
            connections.calculateConnectionWeights(weights, points, 1.0, 0.0);
            std::vector<std::uint8_t> mask(points.size());
            for (std::size_t i = 0; i < mask.size(); i += 3)
                mask[i] = 255;
            for (const Smoothing& settings : {Smoothing{}, Smoothing{0.3F}, Smoothing{1.0F, &mask}})
                for (const std::size_t passes : {1U, 2U, 3U}) {
                    Points expected = points, scratch;
                    connections.mushArray(expected, scratch, passes, settings.step, settings.mask, &weights, false);
                    EXPECT_TRUE(same(smoothOnDevice(program, connections, weights, points, passes, settings), expected,
                                     roundingLimit()))
                        << mesh.name << ", " << mapName << ", step " << settings.step << ", passes " << passes;
                }
        }
}

} // namespace
