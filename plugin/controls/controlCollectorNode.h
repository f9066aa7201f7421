// SPDX-License-Identifier: Apache-2.0
// The control collector: values of a rig, in lists, as one array without gaps.
#pragma once

#include "openquarn/HPxNode.h"

namespace neuralWarp {

/// output[k] is the k-th value of inputList[i].input[j], ascending in i, then in j. docs/controlNodes.md lists the
/// attributes; limits and sampling settings are kept with the scene for other tools and affect nothing here.
class controlCollectorNode final : public HPxNode {
public:
    static const HTypeId id;
    static const HString typeName;
    /// Null when there is no memory for a node. [main]
    static HPxNode* create();
    /// Makes the attributes below, and says what affects what. For HFnPlugin::registerNode. [main]
    static HStatus initialize();

    controlCollectorNode();
    ~controlCollectorNode() override;

    /// Writes all of `output`, whatever plug is asked for; leaves it as it is while there is no list. A writing that
    /// the host stops is no failure: what was written by then stays. [eval]
    HStatus compute(const HPlug& plug, HDataBlock& block) override;
    /// Empties a list `inputList[i].input` that was connected as a whole. [main]
    HStatus connectionBroken(const HPlug& plug, const HPlug& otherPlug, bool asSource) override;

    static HObject inputList;
    static HObject input; ///< child of inputList
    static HObject limitsList;
    static HObject limits;   ///< child of limitsList
    static HObject minValue; ///< children of limits
    static HObject maxValue;
    static HObject defaultValue;
    static HObject samples;
    static HObject activationRate;
    static HObject samplesStartFrame;
    static HObject output;
};

} // namespace neuralWarp
