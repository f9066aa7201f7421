// SPDX-License-Identifier: Apache-2.0
// What the host asks of the deformer before it moves one to the GPU.
#pragma once

#include "openquarn/gpu/HGPUDeformerRegistrationInfo.h"

namespace neuralWarp {

class neuralWarpNodeGPUDeformerInfo final : public HGPUDeformerRegistrationInfo {
public:
    /// The only one, which goes with the library. [any]
    static neuralWarpNodeGPUDeformerInfo& instance();
    /// Name of the maker, under which it is registered.
    static const HString registrantId;

    /// A neuralWarpGPUNode; null when there is no memory for one. [main]
    HPxGPUDeformer* createGPUDeformer() override;
    /// Always true: what a node lacks shows when it is evaluated. [main]
    bool validateNodeInGraph(HDataBlock& block, const HObject& node, const HPlug& plug,
                             HStringArray* messages) override;
    bool validateNodeValues(HDataBlock& block, const HObject& node, const HPlug& plug, HStringArray* messages) override;
    /// Appends the mesh that the geometry is morphed to. [main]
    void additionalInputMeshAttributes(const HObject& node, HObjectArray& attributes) const override;

private:
    neuralWarpNodeGPUDeformerInfo() = default;
};

} // namespace neuralWarp
