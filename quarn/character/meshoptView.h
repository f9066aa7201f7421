// SPDX-License-Identifier: Apache-2.0
// Buffer views that are compressed by the glTF extension EXT_meshopt_compression.
#pragma once

#include "quarn/character/gltfJson.h"

#include <string>
#include <string_view>

namespace quarn {

/// How an extension of a view says its data are compressed. All of it is checked.
struct MeshoptLayout {
    std::uint64_t stride = 0; ///< bytes of an element
    std::uint64_t count = 0;  ///< elements; stride * count is at most 2^62
    std::string mode;         ///< ATTRIBUTES, TRIANGLES or INDICES
    std::string filter;       ///< NONE, OCTAHEDRAL, QUATERNION or EXPONENTIAL
};

/// Throws std::runtime_error, naming `owner`, when the extension contradicts itself.
MeshoptLayout meshoptLayout(const JsonValue& extension, const std::string& owner);

/// The data of the view, stride * count bytes, which the caller has found bearable. `bytes` are not trusted: throws
/// std::runtime_error, naming `owner`, when they are damaged.
std::string meshoptDecoded(const MeshoptLayout& layout, std::string_view bytes, const std::string& owner);

} // namespace quarn
