// SPDX-License-Identifier: Apache-2.0
// Reading and writing the value of a slot: what plugs, data handles and commands share.
#pragma once

#include "graph/Slot.h"

#include <memory>
#include <string>

namespace OpenQuarn {

// Reads of a slot whose kind does not fit give 0, "", the identity or null.
double numberIn(const Slot& slot);
int intIn(const Slot& slot);     ///< rounded, and brought into range
short shortIn(const Slot& slot); ///< rounded, and brought into range
std::string textIn(const Slot& slot);
MatrixValue matrixIn(const Slot& slot);

// Writes put the value in, stored as the attribute stores it. They answer with why they cannot, empty on success.
std::string putNumber(Slot& slot, double value);
std::string putData(Slot& slot, std::shared_ptr<Data> data);

} // namespace OpenQuarn
