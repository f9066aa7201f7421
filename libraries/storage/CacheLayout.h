// SPDX-License-Identifier: Apache-2.0
// Where in a file the points of a cache lie, as its head says it. A format a function, which gets the open file and
// throws std::runtime_error, with the reason alone, when the file is none of the kind or its size is not what its head
// says: whoever has a layout can read every point of it. Nothing is sized by a number of the file before that
// (decision 0167).
#pragma once

#include "storage/Descriptor.h"
#include "storage/FileBytes.h"

#include <cstddef>
#include <cstdint>
#include <filesystem>
#include <optional>

namespace storage {

/// [frames, vertices, 3] numbers, one after the other.
struct CacheLayout {
    std::uint64_t frames = 0;
    std::uint64_t vertices = 0;
    std::size_t scalarSize = 4; ///< 4, or 8 where they are little-endian
    bool isBigEndian = false;
    FileBytes points;                ///< exactly the numbers
    FileBytes times;                 ///< seconds, a single number a frame, big-endian; empty where there are none
    std::optional<float> firstFrame; ///< of the first sample, as PC2 or the names say it
    std::optional<float> frameStep;  ///< frames from one sample to the next; the same
    Descriptor unpacked;             ///< what `points` lie in where the file itself is compressed or in text
};

CacheLayout npyLayout(const FileBytes& file);
/// Of the one array in the archive. A compressed one is unpacked into a file without a name in the folder for temporary
/// files, gone with its descriptor.
CacheLayout npzLayout(const FileBytes& file);
CacheLayout pc2Layout(const FileBytes& file);
CacheLayout mddLayout(const FileBytes& file);
/// Of the vertices of meshes in OBJ files, one a frame (a path with "#", framePattern.h), or of a single one: the lines
/// "v x y z" and nothing else, as singles in a file as for a compressed archive. `firstFrame` and `frameStep` are those
/// of the names; a single file has none. Throws too when there is no such file, one is missing between two others, one
/// has another number of vertices than the first, and when all together are larger than unpackedLimit.
CacheLayout objLayout(const std::filesystem::path& path);

/// The rest of `file` from byte `from` on, which may lie beyond its end. Throws unless it is exactly what the numbers
/// of the layout take; the reason has the shape.
FileBytes pointsOf(const CacheLayout& layout, const FileBytes& file, std::uint64_t from);

} // namespace storage
