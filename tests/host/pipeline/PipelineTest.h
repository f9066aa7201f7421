// SPDX-License-Identifier: Apache-2.0
// A scene whose test deformers can run on the device.
#pragma once

#include "host/geometry/FilterTest.h"
#include "host/pipeline/gpuDeformers.h"
#include "support/TemporaryFolder.h"

#include "openquarn_app/Gpu.h"

#include <gtest/gtest.h>

class PipelineTest : public FilterTest {
protected:
    PipelineTest() {
        registerPush();
        OpenQuarn::Gpu::setEnabled(true);
        OpenQuarn::Gpu::resetCounts();
    }
    void SetUp() override {
        if (OpenQuarn::Gpu::devices().empty())
            GTEST_SKIP() << "no OpenCL device";
    }

public:
    ~PipelineTest() override {
        gpuDeformers::hooks = {};
        OpenQuarn::Gpu::setEnabled(false);
        EXPECT_EQ(gpuDeformers::Seen::alive, 0) << "a deformer stayed behind when its geometry left the device";
    }

protected:
    void registerPush() { gpuDeformers::registerPush(kernels_.path().string()); }
    /// A deformer that pushes what the plug `from` gives by what the node "NAME_push" gives; that node's "in" is the
    /// animated value.
    static void makePusher(const std::string& name, const std::string& from) {
        testNodes::create("testCase", name + "_push");
        testNodes::create("testDeformer", name);
        testNodes::connect(name + "_push.out", name + ".push");
        testNodes::connect(from, input(name, 0));
    }
    static void animate(const std::string& name, double push) {
        EXPECT_EQ(testNodes::text(testNodes::plug(name + "_push.in").setDouble(push)), "");
    }
    static std::vector<double> pushedBy(const std::string& name, const HObject& from) {
        return pushed(output(name, 0), from);
    }
    /// "gpu" or "cpu": where the next evaluation of the geometry runs.
    static std::string evaluatedOn(const std::string& name, unsigned index = 0) {
        OpenQuarn::Gpu::resetCounts();
        EXPECT_EQ(evaluate(output(name, index)), "");
        const OpenQuarn::GpuCounts counts = OpenQuarn::Gpu::counts();
        return counts.gpuEvaluations + counts.cpuEvaluations == 0 ? "nowhere"
               : counts.cpuEvaluations == 0                       ? "gpu"
               : counts.gpuEvaluations == 0                       ? "cpu"
                                                                  : "both";
    }
    /// Evaluates twice, so that the next change is one for the device.
    static void prime(const std::string& name) {
        EXPECT_EQ(evaluatedOn(name), "cpu");
        animate(name, 1.5);
        EXPECT_EQ(evaluatedOn(name), "gpu");
    }

private:
    TemporaryFolder kernels_;
};
