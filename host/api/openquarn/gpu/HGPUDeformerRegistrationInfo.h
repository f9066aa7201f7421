// SPDX-License-Identifier: Apache-2.0
// What the host asks of a plug-in before it moves a deformer to the GPU.
#pragma once

#include "openquarn/HObjectArray.h"
#include "openquarn/HPlug.h"
#include "openquarn/HStringArray.h"

class HDataBlock;
class HPxGPUDeformer;

/// One object of a derived class stands for the GPU version of a node type. The plug-in owns it, and keeps it for as
/// long as it is registered (HGPUDeformerRegistry). [main] throughout, unless a function says otherwise.
class OPENQUARN_API HGPUDeformerRegistrationInfo {
public:
    HGPUDeformerRegistrationInfo();
    HGPUDeformerRegistrationInfo(const HGPUDeformerRegistrationInfo&) = delete;
    HGPUDeformerRegistrationInfo& operator=(const HGPUDeformerRegistrationInfo&) = delete;
    virtual ~HGPUDeformerRegistrationInfo();

    /// Makes one object for one geometry of one node, with `new`; the host owns it. Null when there is no memory: the
    /// geometry stays on the CPU.
    virtual HPxGPUDeformer* createGPUDeformer() = 0;
    /// Whether the node can be moved to the GPU as it is connected. Adds to `messages` why not. The base class: true.
    virtual bool validateNodeInGraph(HDataBlock& block, const HObject& node, const HPlug& plug, HStringArray* messages);
    /// Whether the node can be moved with the values that it has. Adds to `messages` why not. The base class: true.
    virtual bool validateNodeValues(HDataBlock& block, const HObject& node, const HPlug& plug, HStringArray* messages);
    /// The attribute that gives the deformed geometry. The base class: "outputGeom" of `node`; null when it has none.
    virtual HObject outputMeshAttribute(const HObject& node) const;
    /// The attribute that takes the geometry to be deformed. The base class: "inputGeometry" of `node`; null when it
    /// has none.
    virtual HObject inputMeshAttribute(const HObject& node) const;
    /// Appends the attributes of other meshes whose positions the GPU version reads. The base class: nothing.
    virtual void additionalInputMeshAttributes(const HObject& node, HObjectArray& attributes) const;
    /// Whether an output element is made from the input element of the same index, and no other. The base class: true.
    virtual bool matchAncestorLogicalIndices() const;
    /// The attribute whose geometry passes through unchanged when the deformer does nothing. The base class: what
    /// inputMeshAttribute() answers.
    virtual HObject passThroughInputMeshAttribute(const HObject& node) const;
    /// Whether the node is a geometry filter, with a weight for each vertex and an envelope. The base class: true.
    virtual bool isGeometryFilter() const;
};
