// SPDX-License-Identifier: Apache-2.0
// neuralWarp model runtime: "principal_shapes.json" of a model directory.
#pragma once

#include <cstdint>
#include <filesystem>
#include <vector>

namespace neuralWarp {

/// Largest "principal_shapes.json" that is read, in bytes; room for some fifty million coordinates. A file of that size
/// can take up to twenty times as much memory while it is parsed.
inline constexpr std::uint64_t principalShapesFileLimit = std::uint64_t{1} << 30;

/// Reads the basis of principal shapes of a model.
///
/// `path`       full path of the file; regular files only, as for readMetadataFile.
/// `values`     cleared first; on success 3 * shapeCount * vertCount floats, vertex-major: component c of vertex v in
///              shape s stands at (v * shapeCount + s) * 3 + c. Model (object) space units.
/// `shapeCount` set to 0 first, then to the number of shapes S.
/// `vertCount`  set to 0 first, then to the number of vertices V of each shape.
///
/// Returns true on success, also when S or V is 0 (nothing to load, `values` empty). On failure `values` is empty and S
/// is 0, and one line has gone to standard output:
///   "Failed to open metadata file stream\n", "Parse error\n" or "Error: PATH: REASON\n"    as for readMetadataFile;
///                                                                                         V is 0
///   "Error: principalShapeCount does not match the number of principal shapes\n"    V stays as read
///   "Error: PATH: shape I REASON\n"    it is not an array, is shorter than 3 * V, or holds anything but numbers that a
///                                      float can hold, even behind its first 3 * V elements; V stays as read
/// A number beyond the range of float is refused rather than taken as infinity, because one such value would make
/// every position of its vertex infinite or NaN. Never throws.
///
/// Thread: any; no shared state.
bool readPrincipalShapesFile(const std::filesystem::path& path, std::vector<float>& values, std::uint64_t& shapeCount,
                             std::uint64_t& vertCount) noexcept;

} // namespace neuralWarp
