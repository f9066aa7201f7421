// SPDX-License-Identifier: Apache-2.0
// The values of glTF accessors, however the file stores them: sparse, compressed, in whole numbers.
#pragma once

#include "quarn/character/GltfBytes.h"

#include <string>
#include <vector>

namespace quarn {

/// Whether an accessor has nothing but its values as they are, one element after the other or at a stride.
bool isStoredPlainly(const JsonValue& document, std::size_t accessor);

/// The elements of an accessor, one after the other, in its own component type; an accessor without data has zeros.
/// The document has passed checkGltf(). Throws std::runtime_error, with the reason, for what only the data show.
std::string packedValues(const JsonValue& document, std::size_t accessor, GltfBytes& bytes);

/// The same as numbers: whole numbers are brought to -1 ... 1 or 0 ... 1 where the accessor says they are normalized.
std::vector<float> floatValues(const JsonValue& document, std::size_t accessor, GltfBytes& bytes);

} // namespace quarn
