// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "openquarn/HMatrix.h"
#include "types/Data.h"

namespace OpenQuarn {

inline HMatrix toMatrix(const MatrixValue& values) {
    HMatrix matrix;
    for (unsigned i = 0; i < 16; ++i)
        matrix(i / 4, i % 4) = values[i];
    return matrix;
}

inline MatrixValue fromMatrix(const HMatrix& matrix) {
    MatrixValue values;
    for (unsigned i = 0; i < 16; ++i)
        values[i] = matrix(i / 4, i % 4);
    return values;
}

} // namespace OpenQuarn
