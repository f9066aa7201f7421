// SPDX-License-Identifier: Apache-2.0
// Moves geometries by the sum of shapes.
#pragma once

#include "openquarn/HPxDeformerNode.h"

#include <map>
#include <memory>
#include <mutex>

namespace rig {

struct ShapeState;

/// A deformer: addShapes.h is what it does, ShapeDeltas.h and combinedWeight.h what it wants of its lists.
/// docs/rigNodes.md lists the attributes.
class blendShapeNode final : public HPxDeformerNode {
public:
    static const HTypeId id;
    static const HString typeName;
    /// Null when there is no memory for a node. [main]
    static HPxNode* create();
    /// Makes the attributes below, and says what affects what. For HFnPlugin::registerNode. [main]
    static HStatus initialize();

    blendShapeNode();
    ~blendShapeNode() override;

    /// Leaves a geometry that has no shapes alone. Fails, naming shape, list, position and value, for lists that are
    /// damaged or name vertices that the geometry does not have, for combinations that are damaged, and for a weight
    /// that is not finite. [eval]
    HStatus deform(HDataBlock& block, HItGeometry& iterator, const HMatrix& localToWorld, unsigned multiIndex) override;

    static HObject weight;
    static HObject combination;
    static HObject factors; ///< child of combination
    static HObject ramps;   ///< child of combination
    static HObject shapes;
    static HObject shape;    ///< child of shapes
    static HObject vertices; ///< child of shape
    static HObject deltas;   ///< child of shape

private:
    ShapeState& stateOf(unsigned multiIndex);
    HStatus deformByShapes(HDataBlock& block, HItGeometry& iterator, ShapeState& state, unsigned multiIndex);

    std::mutex statesMutex_; // several geometries may be deformed at the same time
    std::map<unsigned, std::unique_ptr<ShapeState>> states_;
};

} // namespace rig
