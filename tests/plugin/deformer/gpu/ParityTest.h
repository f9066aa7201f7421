// SPDX-License-Identifier: Apache-2.0
// Scenes in the host's pipeline: what a frame came to on the device, and on the CPU.
#pragma once

#include "plugin/deformer/gpu/ParityScene.h"
#include "plugin/deformer/support/WarpTest.h"

class ParityTest : public WarpTest {
protected:
    using Texts = std::vector<std::string>;

    void SetUp() override {
        if (OpenQuarn::Gpu::devices().empty())
            GTEST_SKIP() << "no OpenCL device";
        OpenQuarn::Gpu::setEnabled(true);
    }

public:
    ~ParityTest() override {
        OpenQuarn::Gpu::setEnabled(false);
        OpenQuarn::Gpu::assumeNoDoubles(false);
    }

protected:
    struct Frame {
        HStatus status;
        HPointArray points;
        OpenQuarn::GpuCounts counts;
    };
    static Frame evaluated(const parity::Scene& scene, std::size_t geometry = 0) {
        OpenQuarn::Gpu::resetCounts();
        const HStatus status = scene.evaluate(geometry);
        return {status, scene.result(geometry), OpenQuarn::Gpu::counts()};
    }
    /// The same frame again, on the CPU.
    static HPointArray deformed(const parity::Scene& scene, std::size_t geometry = 0) {
        EXPECT_EQ(scene.deform(geometry), HStatus::kSuccess);
        return scene.result(geometry);
    }
    /// The first evaluation, the CPU's. Messages are those of models that are not of the geometry's vertices.
    void prime(const parity::Scene& scene) {
        for (std::size_t g = 0; g < scene.geometryCount(); ++g)
            EXPECT_EQ(scene.deform(g), HStatus::kSuccess);
        EXPECT_THAT(takeMessages(), testing::Each(testing::StartsWith("warning: [NEURAL WARP ")));
    }
    static void expectNear(const parity::Scene& scene, std::size_t geometry, const HPointArray& gpu,
                           const HPointArray& cpu) {
        const parity::Limits& limits = scene.limits(geometry);
        const double size = scene.size(geometry, cpu);
        EXPECT_LE(parity::largestDistance(gpu, cpu), limits.absolute + limits.relative * size);
        EXPECT_LE(parity::meanDistance(gpu, cpu), limits.absolute + limits.mean * size);
    }
    static bool areSame(const HPointArray& a, const HPointArray& b) {
        return a.length() == b.length() && firstDifference(a, b) == a.length();
    }
};
