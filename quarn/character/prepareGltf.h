// SPDX-License-Identifier: Apache-2.0
// What the importer loses of a glTF file is saved here before it gets it.
#pragma once

#include "quarn/character/SourceHints.h"

#include <string>

namespace quarn {

/// The bytes of a .gltf or .glb file, checked and with nodes that have names of their own: the importer tells nodes
/// apart by nothing else. The file's names and what else the importer does not tell are added to `hints`. Throws
/// std::runtime_error with the reason when the file is damaged.
std::string prepareGltf(const std::string& bytes, SourceHints& hints);

} // namespace quarn
