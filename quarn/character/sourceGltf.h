// SPDX-License-Identifier: Apache-2.0
// A glTF file as it is, with its materials, pictures and whatever else it has, to be written again with more in it.
#pragma once

#include "storage/Json.h"

#include <string>
#include <vector>

namespace quarn {

/// All that the file has, in one document and one buffer.
struct SourceGltf {
    storage::JsonDocument document; ///< has passed checkGltf(); one buffer without URI, views without compression
    std::string binary;             ///< the data of the buffer; a multiple of 4 bytes
    std::vector<std::string> notes; ///< what could not be taken in: sentences without a full stop
};

/// Reads a .gltf or .glb file, with the buffers and pictures beside it, and what meshoptimizer has compressed; values
/// stay as they are otherwise. A picture that cannot be read keeps its URI, with a note. Throws std::runtime_error,
/// "PATH: reason". Thread: as readCharacter().
SourceGltf readSourceGltf(const std::string& path);

} // namespace quarn
