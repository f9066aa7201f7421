// SPDX-License-Identifier: Apache-2.0
// The checks that the importer leaves out: it reads wherever the indices and counts of a glTF file point.
#pragma once

#include "quarn/character/gltfJson.h"

namespace quarn {

/// Throws std::runtime_error with the reason when an index points nowhere, an accessor or view leaves its buffer, two
/// accessors that belong together differ in their counts, or the nodes are no forest of at most 1000 levels.
/// Also when the file needs an extension of its geometry that is not read. Views and accessors are inside of what
/// "byteLength" says; what is in the data is still to be checked. Materials and cameras are not looked at.
void checkGltf(const JsonValue& document);

} // namespace quarn
