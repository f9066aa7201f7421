// SPDX-License-Identifier: Apache-2.0
// A flat grid of quads, for scenes that need a mesh and have none.
#pragma once

#include "openquarn/HPxNode.h"

namespace rig {

/// outMesh: a rectangle in the plane y = 0 around the origin, facing up. docs/rigNodes.md lists the attributes, and the
/// order of the vertices.
class polyGridNode final : public HPxNode {
public:
    static const HTypeId id; ///< 0x6e770024
    static const HString typeName;
    /// Null when there is no memory for a node. [main]
    static HPxNode* create();
    /// Makes the attributes below, and says what affects what. For HFnPlugin::registerNode. [main]
    static HStatus initialize();

    polyGridNode();
    ~polyGridNode() override;

    /// Fails, naming attribute and value, for a size that is negative or not finite, for subdivisions below 1, and for
    /// more than 1 048 576 vertices. [eval]
    HStatus compute(const HPlug& plug, HDataBlock& block) override;

    static HObject width;
    static HObject depth;
    static HObject subdivisionsWidth;
    static HObject subdivisionsDepth;
    static HObject outMesh;
};

} // namespace rig
