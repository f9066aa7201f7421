// SPDX-License-Identifier: Apache-2.0
// Which vertex of the scene each vertex of a character's file has become.
#pragma once

#include <cstdint>
#include <filesystem>
#include <span>
#include <string>
#include <vector>

namespace quarn {

/// The file that `vertexMapFile` of the scene's node of type "character" names, for the mesh of that name ("{mesh}" in
/// it); an '<i4' array, see readIntegers(). A relative name counts from the scene's folder. Throws
/// std::runtime_error, with what to do, when the scene names none. Thread: main.
std::filesystem::path vertexMapFile(const std::string& meshName);

/// Reads that file: the scene's vertex of each vertex of the character's file. Throws std::runtime_error as the above,
/// as readIntegers() does, and when the file is another one than the scene was made with (`vertexMapDigests` of the
/// character, where it has some). Thread: main.
std::vector<std::int32_t> readVertexMap(const std::string& meshName);

/// How a scene knows a vertex map again: a sum of its numbers. Thread: any.
std::string vertexMapDigest(std::span<const std::int32_t> map);

} // namespace quarn
