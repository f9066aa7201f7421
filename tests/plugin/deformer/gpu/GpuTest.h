// SPDX-License-Identifier: Apache-2.0
// Drives the GPU deformer of a geometry as the host's pipeline does, without its rules of when.
#pragma once

#include "core/Object.h"
#include "deformer/neuralWarpNodeGPUDeformerInfo.h"
#include "gpu/deformerImpl.h"
#include "openquarn/gpu/HOpenCLInfo.h"
#include "openquarn/gpu/HOpenCLUtils.h"
#include "openquarn_app/Gpu.h"
#include "plugin/deformer/support/FailureTest.h"

#include <memory>

class GpuTest : public FailureTest {
public:
    using Status = HPxGPUDeformer::DeformerStatus;

    void SetUp() override {
        if (OpenQuarn::Gpu::devices().empty())
            GTEST_SKIP() << "no OpenCL device";
    }

    HPxGPUDeformer::Impl& told() const { return *OpenQuarn::Access::impl(*gpu); } ///< what the host tells it

    /// A scene that was evaluated on the CPU, and a deformer that was never used.
    void makeEvaluated() {
        makeRig();
        EXPECT_EQ(rig->deform(0), HStatus::kSuccess);
        makeDeformer();
    }
    void makeDeformer() {
        gpu.reset(neuralWarp::neuralWarpNodeGPUDeformerInfo::instance().createGPUDeformer());
        OpenQuarn::Gpu::resetCounts();
    }
    neuralWarp::neuralWarpData& state() const { return *rig->state(0); }

    /// Evaluates geometry 0; `positions` is what came out, empty when nothing did.
    Status evaluate() {
        HDataBlock block = nodeOf(*rig).forceCache();
        describe(block);
        const HPlug in = rig->plug("input[0].inputGeometry");
        HGPUDeformerData input, output;
        input.setBuffer(in, HPxGPUDeformer::sPositionsName, uploaded(coordinates(warpRig::pointsOf(in.asHObject()))));
        if (!target.empty())
            input.setBuffer(rig->plug("targetMorphGeometry[0]"), HPxGPUDeformer::sPositionsName, uploaded(target));
        const Status status =
            gpu->evaluate(block, HEvaluationNode(rig->node), rig->output(0), HPlugArray{in}, input, output);
        positions = downloaded(output.getBuffer(rig->output(0), HPxGPUDeformer::sPositionsName));
        return status;
    }

    /// Largest distance along an axis from `expected`; infinite when there are not as many.
    double distanceTo(const Coordinates& expected) const {
        if (positions.size() != expected.size())
            return std::numeric_limits<double>::infinity();
        double largest = 0.0;
        for (std::size_t i = 0; i < expected.size(); ++i)
            for (std::size_t axis = 0; axis < 3; ++axis)
                largest = std::max(largest, std::abs(positions[i][axis] - expected[i][axis]));
        return largest;
    }

    std::unique_ptr<HPxGPUDeformer> gpu;
    Coordinates target; ///< on the device; empty: none
    Coordinates positions;

private:
    void describe(HDataBlock& block) const {
        const HIndexMapper mapper = nodeOf(*rig).indexMapper(0);
        HPxGPUDeformer::Impl& impl = told();
        impl.node = rig->node;
        impl.affected = std::make_shared<OpenQuarn::IndexMap>(OpenQuarn::IndexMap{
            mapper.fullCount(),
            mapper.isIdentityMap() ? nullptr : std::make_shared<const HUintArray>(mapper.affectMap())});
        impl.weights = nodeOf(*rig).envelopeWeights(block, 0);
        ++impl.weightsVersion;
    }
    static HOpenCLBuffer uploaded(const Coordinates& points) {
        std::vector<float> values;
        values.reserve(3 * points.size());
        for (const auto& point : points)
            for (const double x : point)
                values.push_back(static_cast<float>(x));
        HOpenCLBuffer buffer;
        EXPECT_EQ(HOpenCLUtils::uploadToGPU(values.size() * sizeof(float), values.data(), buffer), CL_SUCCESS);
        return buffer;
    }
    static Coordinates downloaded(const HOpenCLBuffer& buffer) {
        std::vector<std::array<float, 3>> points(buffer.bufferSize() / (3 * sizeof(float)));
        const HOpenCLEventList ready{buffer.bufferReadyEvent()};
        const cl_int status =
            points.empty()
                ? CL_SUCCESS
                : clEnqueueReadBuffer(HOpenCLInfo::getQuarnDefaultOpenCLCommandQueue(), buffer.get(), CL_TRUE, 0,
                                      buffer.bufferSize(), points.data(), ready.length(), ready.data(), nullptr);
        EXPECT_EQ(status, CL_SUCCESS);
        Coordinates all;
        all.reserve(points.size());
        for (const auto& p : points)
            all.push_back({static_cast<double>(p[0]), static_cast<double>(p[1]), static_cast<double>(p[2])});
        return all;
    }
};
