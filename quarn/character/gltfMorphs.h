// SPDX-License-Identifier: Apache-2.0
// The morph targets of a glTF file, and how they are animated.
#pragma once

#include "quarn/character/GltfBytes.h"
#include "quarn/character/SourceHints.h"

namespace quarn {

/// Adds targets, their weights at rest and over time, to `hints`, and a warning for what is not read of them. The
/// document has passed checkGltf(). Throws std::runtime_error with the reason when the values are not there or damaged.
void readMorphs(const JsonValue& document, GltfBytes& bytes, SourceHints& hints);

} // namespace quarn
