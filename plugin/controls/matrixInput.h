// SPDX-License-Identifier: Apache-2.0
// Reading arrays of matrices.
#pragma once

#include "openquarn/HDataBlock.h"
#include "openquarn/HMatrix.h"

namespace neuralWarp {

/// Calls `visit(logicalIndex, matrix)` for each element of an array of matrices, in ascending order of index, until
/// one of the calls fails; returns its status. An element that holds no matrix is such a failure. [eval]
template <class Visit>
HStatus forEachMatrix(HArrayDataHandle& matrices, Visit&& visit);

/// The element that the handle stands on. Fails when it holds no matrix. [eval]
HStatus readMatrix(HArrayDataHandle& matrices, unsigned& logicalIndex, HMatrix& matrix);

template <class Visit>
HStatus forEachMatrix(HArrayDataHandle& matrices, Visit&& visit) {
    HStatus status;
    const unsigned count = matrices.elementCount();
    for (unsigned position = 0; position < count && !status.error(); ++position) {
        unsigned logicalIndex = 0;
        HMatrix matrix;
        if (position > 0)
            status = matrices.next();
        if (!status.error())
            status = readMatrix(matrices, logicalIndex, matrix);
        if (!status.error())
            status = visit(logicalIndex, matrix);
    }
    return status;
}

} // namespace neuralWarp
