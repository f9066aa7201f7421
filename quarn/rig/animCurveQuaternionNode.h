// SPDX-License-Identifier: Apache-2.0
// A rotation that changes over time.
#pragma once

#include "rig/KeyAttributes.h"

#include "openquarn/HPxNode.h"

namespace rig {

/// outputRotate = the keyed rotation at `time`, as angles; 0 without keys. Keys are quaternions x, y, z, w; linear
/// turns at constant speed by the shorter way between two of them. docs/rigNodes.md lists the attributes.
class animCurveQuaternionNode final : public HPxNode {
public:
    static const HTypeId id;
    static const HString typeName;
    /// Null when there is no memory for a node. [main]
    static HPxNode* create();
    /// Makes the attributes below, and says what affects what. For HFnPlugin::registerNode. [main]
    static HStatus initialize();

    animCurveQuaternionNode();
    ~animCurveQuaternionNode() override;

    /// Fails as KeyTrack::update() does, for a number that is no interpolation or no rotation order, and where a
    /// key that is used has no direction, its length being 0 or not finite. [eval]
    HStatus compute(const HPlug& plug, HDataBlock& block) override;

    static KeyAttributes keys;
    static HObject rotateOrder;
    static HObject outputRotateX, outputRotateY, outputRotateZ, outputRotate;

private:
    KeyTrack track_{4};
};

} // namespace rig
