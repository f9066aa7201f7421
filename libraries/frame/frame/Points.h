// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "quill/val3.h"

#include <vector>

namespace neuralWarp {

/// Points and deltas are stored in single precision, in affected index space (quill::IndexMapper).
using Points = std::vector<quill::val3<float>>;

} // namespace neuralWarp
