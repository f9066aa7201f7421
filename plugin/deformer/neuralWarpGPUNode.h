// SPDX-License-Identifier: Apache-2.0
// The deformer on the GPU: one object for one geometry.
#pragma once

#include "deformer/neuralWarpData.h"
#include "openquarn/gpu/HOpenCLKernelInfo.h"
#include "openquarn/gpu/HPxGPUStandardDeformer.h"
#include "openquarn/gpu/SourceNodeSyncState.h"

#include <cstddef>
#include <cstdint>
#include <vector>

namespace neuralWarp {

/// Does what neuralWarpNode::deform() does, in single precision: the network runs on the CPU, and kernels make
/// positions of its outputs. It loads and builds nothing: the model, the rest caches and the maps are those that the
/// last evaluation on the CPU left in the geometry's neuralWarpData, which it only reads. What depends on the rest
/// shape alone is uploaded when its version is a new one.
class neuralWarpGPUNode final : public HPxGPUStandardDeformer {
public:
    neuralWarpGPUNode() = default;
    ~neuralWarpGPUNode() override;

    using HPxGPUStandardDeformer::evaluate;
    /// kDeformerPassThrough in export mode, and when the network cannot be run, which is then shown; kDeformerFailure,
    /// without a message, when something on the device fails, when the outputs or the target are too small, and when
    /// something was asked for that only an evaluation on the CPU does: that one follows, and says so. [eval]
    DeformerStatus evaluate(HDataBlock& block, const HEvaluationNode& evaluationNode, const HPlug& outputPlug,
                            const HPlugArray& inputPlugs, const HGPUDeformerData& inputData,
                            HGPUDeformerData& outputData) override;
    /// Lets go of everything on the device; the next evaluation uploads all of it again. [eval]
    void terminate() override;

private:
    /// Paths of the kernels' sources, and the folder for their includes.
    struct KernelFiles {
        HString resources;
        HString deformer, utilities, buffers;
        HStringArray includes;

        /// Follows the host's folder of resources.
        void update();
    };

    // Before anything goes to the device.
    void takeSettings(const neuralWarpData& data);
    DeformerStatus findMorph(HDataBlock& block, const HEvaluationNode& evaluationNode,
                             const HGPUDeformerData& inputData);
    cl_int findTarget(const HEvaluationNode& evaluationNode, const HGPUDeformerData& inputData);
    DeformerStatus computeOutputs(HDataBlock& block, neuralWarpData& data, std::vector<float>& outputs);
    bool runInference(HDataBlock& block, neuralWarpData& data, std::vector<float>& outputs);
    DeformerStatus deformPrepared(const HEvaluationNode& evaluationNode, const neuralWarpData& data,
                                  const std::vector<float>& outputs, HOpenCLEvent& event, HGPUDeformerData& outputData);

    // On the device. A status is OpenCL's; each step waits for the event, and replaces it by its own.
    bool uploadSetupBuffers();
    void forgetSetupEvents();
    void takeSlots(const neuralWarpData& data, const std::vector<float>& outputs);
    bool uploadOutputs(const std::vector<float>& outputs);
    bool loadKernels();
    bool areConnectionsUsable() const;
    bool areFramesUsable() const;
    bool areDeltasUsable() const;
    cl_int enqueueDeformation(HOpenCLEvent& event);
    cl_int enqueueGather(HOpenCLEvent& event);
    cl_int enqueueSmoothing(HOpenCLEvent& event, const HOpenCLBuffer*& current);
    cl_int enqueueCopy(HOpenCLEvent& event);
    cl_int enqueuePrincipalShapes(HOpenCLEvent& event);
    cl_int enqueueApply(HOpenCLEvent& event, const HOpenCLBuffer& current);

    deformer_utils::SourceNodeSyncState syncState_;
    float morphEnvelope_ = 0.0F;
    bool morphActive_ = false;
    bool deltasActive_ = true;
    bool principalActive_ = false; ///< the outputs are coefficients of principal shapes
    std::uint32_t shapeCount_ = 0;
    bool useAffectMap_ = false;
    std::uint16_t deltaMode_ = 0;
    std::int32_t smoothingIterations_ = 0;
    std::uint32_t deltaVertexCount_ = 0; ///< slots in deltasBuffer_

    HOpenCLBuffer deltasBuffer_;           ///< [deltaVertexCount_][3] float
    HOpenCLBuffer affectToDeltaMapBuffer_; ///< [affectCount()] uint; empty unless useAffectMap_
    HOpenCLBuffer framesIndexerBuffer_;    ///< as quill::VertexFrames has them
    HOpenCLBuffer framesPairsBuffer_;
    HOpenCLBuffer connectionsBuffer_; ///< as quill::VertexConnections has them
    HOpenCLBuffer connectionsIndexerBuffer_;
    HOpenCLBuffer connectionWeightsBuffer_;
    HOpenCLBuffer targetPositionsBuffer_;   ///< the host's; null unless morphActive_
    HOpenCLBuffer restPointsBuffer_;        ///< [affectCount()][3] float
    HOpenCLBuffer restFramesInverseBuffer_; ///< [affectCount()][16] double
    HOpenCLBuffer principalShapesBuffer_;   ///< [deltaVertexCount_][shapeCount_][3] float
    HOpenCLBuffer coefficientsBuffer_;      ///< [shapeCount_] float, and what the network gives beyond
    HOpenCLBuffer affectPositionsA_;        ///< [affectCount()][3] float, as the next
    HOpenCLBuffer affectPositionsB_;

    HOpenCLKernelInfo applyKernel_;
    HOpenCLKernelInfo smoothKernel_;
    HOpenCLKernelInfo principalShapesKernel_;
    HOpenCLKernelInfo copyToAffectKernel_;

    KernelFiles kernelFiles_;
    std::vector<float> controls_; ///< kept for its memory
};

} // namespace neuralWarp
