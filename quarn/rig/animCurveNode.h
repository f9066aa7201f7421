// SPDX-License-Identifier: Apache-2.0
// A number that changes over time.
#pragma once

#include "rig/KeyAttributes.h"

#include "openquarn/HPxNode.h"

namespace rig {

/// output = the keyed value at `time`; 0 without keys. docs/rigNodes.md lists the attributes.
class animCurveNode final : public HPxNode {
public:
    static const HTypeId id;
    static const HString typeName;
    /// Null when there is no memory for a node. [main]
    static HPxNode* create();
    /// Makes the attributes below, and says what affects what. For HFnPlugin::registerNode. [main]
    static HStatus initialize();

    animCurveNode();
    ~animCurveNode() override;

    /// Fails as KeyTrack::update() does, and for a number that is no interpolation. [eval]
    HStatus compute(const HPlug& plug, HDataBlock& block) override;

    static KeyAttributes keys;
    static HObject drawnKeys; ///< a note for readers of the scene: affects nothing
    static HObject output;

private:
    KeyTrack track_{1};
};

} // namespace rig
