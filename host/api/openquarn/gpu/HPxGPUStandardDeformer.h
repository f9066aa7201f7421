// SPDX-License-Identifier: Apache-2.0
// Base class of GPU deformers that have an affected set, weights and an envelope.
#pragma once

#include "openquarn/gpu/HPxGPUDeformer.h"

/// Does what every deformer has to do around its own kernels. In the order of use: prepareEvaluation(), the two
/// prepare…Buffer(), initializeOutputPositions(), the deformer's kernels from inputPositions() to outputPositions(),
/// finishEvaluation(). What the functions below answer is that of the evaluation that was prepared last.
class OPENQUARN_API HPxGPUStandardDeformer : public HPxGPUDeformer {
public:
    HPxGPUStandardDeformer();
    ~HPxGPUStandardDeformer() override;

    /// Also lets go of the buffers below. [eval]
    void terminate() override;

    /// Takes the arguments of evaluate(): finds the input positions, reads the envelope, makes room for the output.
    /// `event` receives what has to have happened before the input is read; may become null. kDeformerSuccess: go on.
    /// kDeformerPassThrough with an envelope of 0, where passThroughWithZeroEnvelope() allows it. [eval]
    DeformerStatus prepareEvaluation(HDataBlock& block, const HEvaluationNode& evaluationNode, const HPlug& outputPlug,
                                     const HPlugArray& inputPlugs, const HGPUDeformerData& inputData,
                                     HGPUDeformerData& outputData, HOpenCLEvent& event);
    /// Uploads the affected vertices when they are others than last time. initializeOutputPositions() answers for a
    /// failure. [eval]
    void prepareAffectMapBuffer();
    /// The same for the weights. [eval]
    void prepareWeightsBuffer(const HEvaluationNode& evaluationNode);
    /// Has the input uploaded, which may have been left until now, and copies it to the output where some vertices are
    /// not affected, after `event`, which it replaces. [eval]
    cl_int initializeOutputPositions(HOpenCLEvent& event);
    /// Hands the output positions on, ready after `event`. kDeformerFailure where a step before has failed. [eval]
    DeformerStatus finishEvaluation(const HOpenCLEvent& event, HGPUDeformerData& outputData);

    /// Positions of all vertices of the geometry: 3 floats each, packed. They too are uploaded by now. [eval]
    const HOpenCLBuffer& inputPositions() const;
    HOpenCLBuffer& outputPositions();
    /// Number of vertices of the geometry. [eval]
    unsigned vertexCount() const;
    /// Number of affected vertices. [eval]
    unsigned affectCount() const;
    /// For each affected vertex its index in the geometry, as cl_uint; null when isIdentityMap(). [eval]
    const HOpenCLBuffer& affectMapBuffer() const;
    bool isIdentityMap() const;
    /// A float for each affected vertex; null unless hasEnvelopeWeights(). [eval]
    const HOpenCLBuffer& weightsBuffer() const;
    bool hasEnvelopeWeights() const;
    float envelope() const;

private:
    struct Standard;
    std::unique_ptr<Standard> standard_;
};
