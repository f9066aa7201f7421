// SPDX-License-Identifier: Apache-2.0
#include "controls/matrixInput.h"

namespace neuralWarp {

HStatus readMatrix(HArrayDataHandle& matrices, unsigned& logicalIndex, HMatrix& matrix) {
    HStatus status;
    const HDataHandle element = matrices.inputValue(&status);
    if (status.error())
        return status;
    const HFnMatrixData data(element.data(), &status);
    if (status.error())
        return status;
    matrix = data.matrix();
    logicalIndex = matrices.elementIndex(&status);
    return status;
}

} // namespace neuralWarp
