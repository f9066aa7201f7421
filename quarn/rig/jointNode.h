// SPDX-License-Identifier: Apache-2.0
// A joint: a transformation in the space of its parent.
#pragma once

#include "openquarn/HPxNode.h"

namespace rig {

/// matrix = S * R * JO * T for row vectors, worldMatrix = matrix * parentMatrix, relativeMatrix = matrix *
/// inverse(restMatrix). docs/rigNodes.md lists the attributes.
class jointNode final : public HPxNode {
public:
    static const HTypeId id;
    static const HString typeName;
    /// Null when there is no memory for a node. [main]
    static HPxNode* create();
    /// Makes the attributes below, and says what affects what. For HFnPlugin::registerNode. [main]
    static HStatus initialize();

    jointNode();
    ~jointNode() override;

    /// Writes the one of the three outputs that is asked for. Fails for a number that is no rotation order, and for
    /// relativeMatrix when restMatrix is singular. [eval]
    HStatus compute(const HPlug& plug, HDataBlock& block) override;

    static HObject translateX, translateY, translateZ, translate;
    static HObject rotateX, rotateY, rotateZ, rotate;
    static HObject rotateOrder;
    static HObject jointOrientX, jointOrientY, jointOrientZ, jointOrient;
    static HObject scaleX, scaleY, scaleZ, scale;
    static HObject parentMatrix;
    static HObject restMatrix;
    static HObject matrix;
    static HObject worldMatrix;
    static HObject relativeMatrix;
};

} // namespace rig
