// SPDX-License-Identifier: Apache-2.0
// Where the control values of a deformer come from.
#pragma once

#include "openquarn/HObject.h"
#include "openquarn/HPlug.h"

namespace quarn {

/// The node types that make numbers of matrices.
constexpr const char* converterType = "matrixConverter";
constexpr const char* axesType = "orthoAxisFromMatrixArray";

/// What a value comes from, beyond the collectors on its way.
struct ControlSource {
    HPlug plug;          ///< it gives the value, or holds it where nothing is connected; with a converter: the matrix
    HObject converter;   ///< of one of the two types above, which makes the value of the matrix; null without one
    unsigned number = 0; ///< which of the numbers that it makes of that matrix
};

/// Of an element of controlValues, or of an input of a collector. The plug has to have been evaluated. Throws
/// std::runtime_error, naming the plug. Thread: main.
ControlSource controlSource(const HPlug& value);

} // namespace quarn
