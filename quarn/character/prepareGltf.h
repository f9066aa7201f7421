// SPDX-License-Identifier: Apache-2.0
// What the importer loses of a glTF file is saved here before it gets it.
#pragma once

#include "quarn/character/GltfBytes.h"
#include "quarn/character/SourceHints.h"

#include <string>

namespace quarn {

/// The bytes of a .gltf or .glb file, checked, with nodes that have names of their own (the importer tells nodes apart
/// by nothing else), and with all values that are read as plain floats and whole numbers, whatever the file has: the
/// importer would take compressed, sparse and quantized ones for something else. The file's names, its morph targets
/// and what else the importer does not tell are added to `hints`. `readUri` is asked for what lies in other files, as
/// far as values have to be changed. Throws std::runtime_error with the reason when the file is damaged. To be called
/// where reading may crash (decision 0172).
std::string prepareGltf(const std::string& bytes, SourceHints& hints, const ReadUri& readUri);

} // namespace quarn
