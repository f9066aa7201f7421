// SPDX-License-Identifier: Apache-2.0
// Poses as texts: JSON that quarn pose --keys reads, and a table.
#pragma once

#include "quarn/pose/FilePlaces.h"
#include "quarn/pose/Motion.h"

#include <iosfwd>

namespace quarn {

/// Keys of all plugs that can take some, in their own units, in every frame; of a plug that stays where it is, in the
/// first and the last. Numbers read back are the same. Throws std::runtime_error for what moves nothing that could be
/// keyed, and when the text grows beyond what quarn pose --keys reads. The stream must be in the classic locale.
void writeKeys(std::ostream& out, const Motion& motion, const FilePlaces& places);

/// One line a frame below a line of names: the number of the frame, and all plugs in their own units. The same numbers
/// and errors.
void writeTable(std::ostream& out, const Motion& motion, const FilePlaces& places);

} // namespace quarn
