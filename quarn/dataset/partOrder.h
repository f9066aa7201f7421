// SPDX-License-Identifier: Apache-2.0
// Whether parts are a whole.
#pragma once

#include "quarn/scene/PartRecord.h"

#include <filesystem>
#include <vector>

namespace quarn {

struct PlacedPart {
    std::filesystem::path path;
    PartRecord record;
};

/// Sorts them by their frames. Throws std::runtime_error, naming the parts, unless they are of one whole and each of
/// its frames is in one of them.
void orderParts(std::vector<PlacedPart>& parts);

/// Throws unless one program has made all of them: the same version and build.
void requireOneBuild(const std::vector<PlacedPart>& parts);

/// Of parts in order: throws where the row that a part has computed for the frame after its last is not the first row
/// of the next part.
void requireSeams(const std::vector<PlacedPart>& parts);

/// Throws that the second was made from other things than the first, with both values.
[[noreturn]] void refuseSetup(const std::filesystem::path& first, const std::filesystem::path& second,
                              const Setup::Difference& difference);

} // namespace quarn
