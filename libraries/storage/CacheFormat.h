// SPDX-License-Identifier: Apache-2.0
// The formats of point caches, and what differs between them.
#pragma once

#include <filesystem>
#include <optional>

namespace storage {

enum class CacheFormat {
    npy, ///< a NumPy array: npyHeader.h says which
    npz, ///< an archive with one such array
    pc2, ///< single precision, little-endian, with the frame of the first sample and the frames between two
    mdd, ///< single precision, big-endian, with each frame's time in seconds
    obj, ///< meshes in text, a file a frame: a pattern as of framePattern.h, or one file; only read (decision 0180)
};

/// By the ending of the name, in capitals or not; none for another. [any]
std::optional<CacheFormat> cacheFormatOf(const std::filesystem::path& path);

/// The endings, for sentences.
inline constexpr const char* cacheEndings = ".npy, .npz, .pc2, .mdd or .obj";

} // namespace storage
