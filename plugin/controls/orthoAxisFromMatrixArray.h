// SPDX-License-Identifier: Apache-2.0
// Matrices as two perpendicular axes each, whatever their scale and shear.
#pragma once

#include "openquarn/HPxNode.h"

namespace neuralWarp {

/// outputList[i].output has six numbers: the axes (axes.h) of rows 0 and 1 of input[i], x, y and z of each.
/// docs/controlNodes.md lists the attributes.
class orthoAxisFromMatrixArray final : public HPxNode {
public:
    static const HTypeId id;
    static const HString typeName;
    /// Null when there is no memory for a node. [main]
    static HPxNode* create();
    /// Makes the attributes below, and says what affects what. For HFnPlugin::registerNode. [main]
    static HStatus initialize();

    orthoAxisFromMatrixArray();
    ~orthoAxisFromMatrixArray() override;

    /// Writes an element of `outputList` for each matrix, whatever plug is asked for, and leaves the others as they
    /// are. An element that cannot be written is no failure; a matrix that cannot be read is. [eval]
    HStatus compute(const HPlug& plug, HDataBlock& block) override;

    static HObject input;
    static HObject outputList;
    static HObject output; ///< child of outputList
};

} // namespace neuralWarp
