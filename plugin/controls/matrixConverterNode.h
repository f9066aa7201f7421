// SPDX-License-Identifier: Apache-2.0
// The matrix converter: matrices as rotation, scale and translation values.
#pragma once

#include "openquarn/HPxNode.h"

namespace neuralWarp {

/// flatOutput has the numbers of all matrices one after the other, outputList[i].output those of input[i];
/// matrixChannels.h says which they are. docs/controlNodes.md lists the attributes.
class matrixConverterNode final : public HPxNode {
public:
    static const HTypeId id;
    static const HString typeName;
    /// Null when there is no memory for a node. [main]
    static HPxNode* create();
    /// Makes the attributes below, and says what affects what. For HFnPlugin::registerNode. [main]
    static HStatus initialize();

    matrixConverterNode();
    ~matrixConverterNode() override;

    /// Writes the one of the two outputs that is asked for. Without any matrix `flatOutput` is emptied, and
    /// `outputList` stays as it is; so does what belongs to an index that `input` no longer has. [eval]
    HStatus compute(const HPlug& plug, HDataBlock& block) override;

    static HObject input;
    static HObject extractRotation;
    static HObject extractScale;
    static HObject extractTranslation;
    static HObject rotationX;
    static HObject rotationY;
    static HObject rotationZ;
    static HObject scaleX;
    static HObject scaleY;
    static HObject scaleZ;
    static HObject translationX;
    static HObject translationY;
    static HObject translationZ;
    static HObject rotationConversion;
    static HObject flatOutput;
    static HObject outputList;
    static HObject output; ///< child of outputList
};

} // namespace neuralWarp
