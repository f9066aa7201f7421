// SPDX-License-Identifier: Apache-2.0
#include "controls/matrixInput.h"

#include "openquarn/HFnAttribute.h"

#include <string>

namespace neuralWarp {
namespace {

// an element without a matrix is an error, not the identity (decision 0057)
HStatus noMatrix(const HArrayDataHandle& matrices, const HDataHandle& element, const HStatus& status) {
    return {status.statusCode(), HFnAttribute(element.attribute()).name().asStdString() + '[' +
                                     std::to_string(matrices.elementIndex()) +
                                     "] holds no matrix: " + status.errorString().asStdString()};
}

} // namespace

HStatus readMatrix(HArrayDataHandle& matrices, unsigned& logicalIndex, HMatrix& matrix) {
    HStatus status;
    const HDataHandle element = matrices.inputValue(&status);
    if (status.error())
        return status;
    const HFnMatrixData data(element.data(), &status);
    if (status.error())
        return noMatrix(matrices, element, status);
    matrix = data.matrix();
    logicalIndex = matrices.elementIndex(&status);
    return status;
}

} // namespace neuralWarp
