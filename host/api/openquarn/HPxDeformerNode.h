// SPDX-License-Identifier: Apache-2.0
// Base class of deformers: geometry filters with a weight for each vertex.
#pragma once

#include "openquarn/HObjectArray.h"
#include "openquarn/HPxGeometryFilter.h"

/// The attributes below belong to the node class "deformer" and to every type registered as HPxNode::kDeformerNode, in
/// addition to those of the geometry filter.
///
/// Only the thread on which the host calls deform() evaluates. A worker of a parallel loop inside of it is a foreign
/// thread: every [eval] call on it is refused, and waits for nothing. A deformer reads what its loop needs before the
/// loop, and writes positions and outputs after it; the loop works on the plug-in's own memory.
class OPENQUARN_API HPxDeformerNode : public HPxGeometryFilter {
public:
    /// Array by geometry, a compound of `weights`.
    static const HObject weightList;
    /// Array of floats by index of the vertex in the whole geometry, default 1: the weight of a vertex that has no
    /// element.
    static const HObject weights;

    HPxDeformerNode();
    ~HPxDeformerNode() override;

    /// A buffer that the node publishes for a GPU deformer, by name; null for a name it does not know. The base
    /// publishes none. [eval]
    virtual HObject getNamedBuffer(const HString& name, unsigned multiIndex);

    /// Appends the attributes of which a new value has to be evaluated on the CPU once before the GPU deformer of the
    /// type can go on: numbers, of which the host reads the element of the geometry below an array. `envelope` always
    /// is one. The base adds nothing. [eval]
    virtual void primingAttributes(HObjectArray& attributes) const;

    /// Whether a geometry has to be evaluated on the CPU next although nothing that the host sees has changed:
    /// something that is done there is due. Asked before each evaluation by the GPU deformer. The base: never. [eval]
    virtual bool isDueOnCpu(HDataBlock& block, unsigned multiIndex);

    /// A weight for each affected vertex, in the order of the index mapper; null when the geometry has no weights,
    /// which is not a failure: all are 1 then. Owned by the host, valid until the next evaluation of this geometry or
    /// change of its weights. Fails, and is null, for another node's data block, and as indexMapper() does. [eval]
    const float* envelopeWeights(HDataBlock& block, unsigned multiIndex, HStatus* status = nullptr);
};
