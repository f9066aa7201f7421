// SPDX-License-Identifier: Apache-2.0
// Named controls of a rig that has no joints for them, as a face.
#pragma once

#include "openquarn/HPxNode.h"

namespace rig {

/// output[i] = slider[i].value. Names, ranges and sampling settings are kept with the scene for other tools and affect
/// nothing here. docs/rigNodes.md lists the attributes.
class slidersNode final : public HPxNode {
public:
    static const HTypeId id; ///< 0x6e770023
    static const HString typeName;
    /// Null when there is no memory for a node. [main]
    static HPxNode* create();
    /// Makes the attributes below, and says what affects what. For HFnPlugin::registerNode. [main]
    static HStatus initialize();

    slidersNode();
    ~slidersNode() override;

    /// Writes all of `output`, whatever element is asked for: one for each slider, with its index, and no others.
    /// [eval]
    HStatus compute(const HPlug& plug, HDataBlock& block) override;

    static HObject slider;
    static HObject sliderName; ///< children of slider
    static HObject value;
    static HObject minValue;
    static HObject maxValue;
    static HObject defaultValue;
    static HObject samples;
    static HObject activationRate;
    static HObject samplesStartFrame;
    static HObject output;
};

} // namespace rig
