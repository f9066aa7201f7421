// SPDX-License-Identifier: Apache-2.0
// Binds geometries to joints.
#pragma once

#include "openquarn/HPxDeformerNode.h"

#include <map>
#include <memory>
#include <mutex>

namespace rig {

struct SkinState;

/// A deformer: linearBlend.h is what it does, SkinWeights.h what it wants of its lists. docs/rigNodes.md lists the
/// attributes.
class skinClusterNode final : public HPxDeformerNode {
public:
    static const HTypeId id;
    static const HString typeName;
    /// Null when there is no memory for a node. [main]
    static HPxNode* create();
    /// Makes the attributes below, and says what affects what. For HFnPlugin::registerNode. [main]
    static HStatus initialize();

    skinClusterNode();
    ~skinClusterNode() override;

    /// Leaves a geometry that has no lists alone. Fails, naming list, position and value, for lists that are damaged or
    /// of another number of vertices, and for a joint that has no matrix. [eval]
    HStatus deform(HDataBlock& block, HItGeometry& iterator, const HMatrix& localToWorld, unsigned multiIndex) override;

    static HObject matrix;
    static HObject bindPreMatrix;
    static HObject skin;
    static HObject influenceCounts; ///< child of skin
    static HObject influences;      ///< child of skin
    static HObject skinWeights;     ///< child of skin
    static HObject normalize;

private:
    SkinState& stateOf(unsigned multiIndex);
    HStatus deformSkinned(HDataBlock& block, HItGeometry& iterator, SkinState& state, unsigned multiIndex);

    std::mutex statesMutex_; // several geometries may be deformed at the same time
    std::map<unsigned, std::unique_ptr<SkinState>> states_;
};

} // namespace rig
