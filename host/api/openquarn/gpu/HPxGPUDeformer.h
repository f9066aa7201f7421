// SPDX-License-Identifier: Apache-2.0
// Base class of what deforms one geometry on the device.
#pragma once

#include "openquarn/HDataBlock.h"
#include "openquarn/HPlug.h"
#include "openquarn/HString.h"
#include "openquarn/gpu/HEvaluationNode.h"
#include "openquarn/gpu/HGPUDeformerData.h"
#include "openquarn/gpu/HOpenCLBuffer.h"

#include <memory>

/// Made by HGPUDeformerRegistrationInfo::createGPUDeformer(), one for each geometry of a node that is moved to the
/// device. When the geometry leaves it (the pipeline is switched off, a frame fails, the device is lost or another one
/// chosen, the node is deleted, the plug-in takes its GPU deformers back), the host calls terminate() and deletes it.
/// The host calls one of the three evaluate() functions, the first: a deformer overrides the one that suits it.
class OPENQUARN_API HPxGPUDeformer {
public:
    enum DeformerStatus : int {
        kDeformerSuccess = 0,
        kDeformerFailure = 1,     ///< The host evaluates the frame on the CPU, and says so once.
        kDeformerPassThrough = 3, ///< The geometry goes on as it came in.
    };

    /// "positions": name of the buffers that hold x, y, z of every vertex as floats, packed, object space.
    static const HString sPositionsName;

    HPxGPUDeformer();
    HPxGPUDeformer(const HPxGPUDeformer&) = delete;
    HPxGPUDeformer& operator=(const HPxGPUDeformer&) = delete;
    virtual ~HPxGPUDeformer();

    /// Enqueues what deforms the geometry, on the host's default queue, and may return before it has run.
    /// `block` values of the node; `outputPlug` the geometry to be made; `inputPlugs` those it is made from, the one of
    /// the same index first; `inputData` has the positions of the first input plug and those of the additional input
    /// meshes; `outputData` receives the positions of `outputPlug`, with their ready event.
    /// The base calls the next one with the first input plug. [eval]
    virtual DeformerStatus evaluate(HDataBlock& block, const HEvaluationNode& evaluationNode, const HPlug& outputPlug,
                                    const HPlugArray& inputPlugs, const HGPUDeformerData& inputData,
                                    HGPUDeformerData& outputData);
    /// The same with one input plug. The base calls the next one with the positions of that plug, and puts what it
    /// wrote into `outputData`. [eval]
    virtual DeformerStatus evaluate(HDataBlock& block, const HEvaluationNode& evaluationNode, const HPlug& outputPlug,
                                    const HPlug& inputPlug, const HGPUDeformerData& inputData,
                                    HGPUDeformerData& outputData);
    /// The same on bare positions of `vertexCount` vertices: `output` has room for as many, and has to get its ready
    /// event. The base answers kDeformerFailure. [eval]
    virtual DeformerStatus evaluate(HDataBlock& block, const HEvaluationNode& evaluationNode, const HPlug& outputPlug,
                                    unsigned vertexCount, const HOpenCLBuffer& input, HOpenCLBuffer& output);

    /// Lets go of everything on the device. The host calls it before it deletes the deformer, whose node is then still
    /// there; others, such as the deformer's own destructor, may call it too, any number of times, and another
    /// evaluate() may follow, which makes everything anew. What it throws becomes a message. The base lets go of what
    /// is its own. [eval]
    virtual void terminate();
    /// Whether the host may pass the geometry through without an evaluate() when the envelope is 0. The base: true.
    /// [eval]
    virtual bool passThroughWithZeroEnvelope() const;

    /// The node that this deforms for; null before the first evaluate(). [eval]
    HObject dependencyNode() const;
    /// Index of the geometry. [eval]
    unsigned multiIndex() const;

    /// Copies the buffer that the node publishes under a name (HPxDeformerNode::getNamedBuffer) to the device.
    /// `status` the running status: nothing happens unless it is CL_SUCCESS, and a failure is put into it; a node that
    /// publishes no such buffer is CL_INVALID_VALUE. `elementCount` number of its elements, 0 on failure. A buffer
    /// without elements gets the size 0. Matrices have 128 bytes each, row by row. [eval]
    void uploadFixedSetupData(const HString& name, HOpenCLBuffer& buffer, cl_int& status, unsigned& elementCount);

    struct Impl; ///< the runtime's
protected:
    friend class OpenQuarn::Access;
    std::unique_ptr<Impl> impl_;
};
