// SPDX-License-Identifier: Apache-2.0
// Which vertex of the scene each vertex of a character's file has become.
#pragma once

#include <cstdint>
#include <filesystem>
#include <string>

namespace quarn {

/// The file that `vertexMapFile` of the scene's node of type "character" names, for the mesh of that name ("{mesh}" in
/// it); an '<i4' array, see readIntegers(). A relative name counts from the current directory. Throws
/// std::runtime_error, with what to do, when the scene names none. Thread: main.
std::filesystem::path vertexMapFile(const std::string& meshName);

} // namespace quarn
