// SPDX-License-Identifier: Apache-2.0
#include "deformer/neuralWarpNodeGPUDeformerInfo.h"

#include "deformer/neuralWarpGPUNode.h"
#include "deformer/neuralWarpNode.h"

namespace neuralWarp {

const HString neuralWarpNodeGPUDeformerInfo::registrantId("Quarn");

neuralWarpNodeGPUDeformerInfo& neuralWarpNodeGPUDeformerInfo::instance() {
    static neuralWarpNodeGPUDeformerInfo info;
    return info;
}

HPxGPUDeformer* neuralWarpNodeGPUDeformerInfo::createGPUDeformer() {
    try {
        return new neuralWarpGPUNode;
    } catch (...) {
        return nullptr;
    }
}

bool neuralWarpNodeGPUDeformerInfo::validateNodeInGraph(HDataBlock&, const HObject&, const HPlug&, HStringArray*) {
    return true;
}

bool neuralWarpNodeGPUDeformerInfo::validateNodeValues(HDataBlock&, const HObject&, const HPlug&, HStringArray*) {
    return true;
}

void neuralWarpNodeGPUDeformerInfo::additionalInputMeshAttributes(const HObject&, HObjectArray& attributes) const {
    attributes.append(neuralWarpNode::targetMorphGeometry);
}

} // namespace neuralWarp
