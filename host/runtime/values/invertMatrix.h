// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "openquarn/HMatrix.h"

namespace OpenQuarn {

/// HMatrix::inverse() for use inside of other operations. False, and `inverse` as it was, for a singular matrix.
bool invertMatrix(const HMatrix& matrix, HMatrix& inverse) noexcept;

} // namespace OpenQuarn
