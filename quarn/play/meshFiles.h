// SPDX-License-Identifier: Apache-2.0
// One posed mesh in a file that other programs open. Vertices are written in the order in which they are given, each
// once, also where two lie at the same place or none of the polygons uses one. Where texture coordinates have a seam
// glTF needs vertices more, which follow behind.
#pragma once

#include "quarn/scene/meshes.h"

#include <filesystem>
#include <iosfwd>
#include <span>

namespace quarn {

/// `xyz` 3 * polygons.vertexCount numbers. The stream must be in the classic locale. OBJ keeps all polygons,
/// and texture coordinates by corner.
void writeObj(std::ostream& out, std::span<const float> xyz, const MeshPolygons& polygons);
/// Binary little-endian, which keeps polygons of up to 255 corners, without texture coordinates. Throws
/// std::runtime_error for larger ones.
void writePly(std::ostream& out, std::span<const float> xyz, const MeshPolygons& polygons);
/// glTF 2.0 knows triangles only: polygons become fans from their first corner. `binary` GLB, else JSON with the
/// numbers in it. Throws std::runtime_error for a mesh without vertices or polygons, and one that is too large.
void writeGltf(std::ostream& out, std::span<const float> xyz, const MeshPolygons& polygons, bool binary);

/// True for ".obj", ".ply", ".gltf" and ".glb".
bool isMeshFile(const std::filesystem::path& path);
/// Writes the file as a whole, in the format of its ending. Throws std::runtime_error that names the path.
void writeMeshFile(const std::filesystem::path& path, std::span<const float> xyz, const MeshPolygons& polygons);

} // namespace quarn
