// SPDX-License-Identifier: Apache-2.0
// Files that say which vertex of the scene a vertex of the character's file has become.
#pragma once

#include <cstdint>
#include <filesystem>
#include <vector>

namespace quarn {

/// Writes a NumPy array of '<i4' numbers, [sceneVertexOf.size()], as a whole file. Throws std::runtime_error, naming
/// the path, when it cannot be written.
void writeVertexMap(const std::filesystem::path& path, const std::vector<std::uint32_t>& sceneVertexOf);

} // namespace quarn
