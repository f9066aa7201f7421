// SPDX-License-Identifier: Apache-2.0
// Values as they stand in messages.
#pragma once

#include "openquarn/HTypeId.h"

#include <string>

namespace OpenQuarn {

/// "0x58000971"
std::string hexText(HTypeId id);

/// The number in the fewest digits that read back the same.
std::string printedNumber(double value);

/// True for what may name a node, an attribute or a node type: a letter or "_", then letters, digits and "_".
bool isIdentifier(const std::string& text);

} // namespace OpenQuarn
