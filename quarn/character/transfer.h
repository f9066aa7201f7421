// SPDX-License-Identifier: Apache-2.0
// A character as bytes, to go from one process of this machine to another.
#pragma once

#include "quarn/character/Character.h"

#include <string>
#include <string_view>

namespace quarn {

/// The bytes of one version of this program on one machine: nothing to keep in a file.
std::string packCharacter(const Character& character);

/// The character again, bit for bit. The bytes are not trusted: sizes are checked before memory is taken, and all
/// indices as Character.h promises them. Throws std::runtime_error, with the reason alone, for anything but what
/// packCharacter() has made.
Character unpackCharacter(std::string_view bytes);

} // namespace quarn
