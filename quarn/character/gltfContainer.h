// SPDX-License-Identifier: Apache-2.0
// A glTF file as its parts, and made of them again.
#pragma once

#include "storage/Json.h"

#include <string>
#include <string_view>

namespace quarn {

struct GltfParts {
    std::string_view json;
    std::string_view chunks; ///< what follows the JSON chunk of the binary form
    std::string_view binary; ///< the data of the first of them
};

/// Of the bytes of a .gltf or .glb file, where they lie. Throws std::runtime_error with the reason when a binary file
/// is damaged.
GltfParts gltfParts(std::string_view bytes);

/// The document of such a JSON text, which has passed checkGltf(). Throws std::runtime_error with the reason.
storage::JsonDocument parseGltf(std::string_view json);

/// The text of a document or a part of one, as short as can be.
std::string gltfText(const storage::JsonValue& value);

/// A binary file; `chunks` as of GltfParts.
std::string binaryGltf(std::string json, std::string_view chunks);

} // namespace quarn
