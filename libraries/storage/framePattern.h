// SPDX-License-Identifier: Apache-2.0
// Names of the files of a range of frames, one a frame: "hand.####.obj".
#pragma once

#include <filesystem>
#include <vector>

namespace storage {

/// Whether the last part of the path has a "#". Thread: any.
bool isFramePattern(const std::filesystem::path& path);

/// The file of a frame: the last run of "#" in the last part of `pattern` becomes the number, padded with zeros to as
/// many digits as it is long ("-0012" for -12). A path without one comes back as it is. Thread: any.
std::filesystem::path frameFile(const std::filesystem::path& pattern, int frame);

/// The numbers of the files that there are of a pattern, which has a "#"; rising. None where the folder cannot be read.
/// Thread: any.
std::vector<int> framesOf(const std::filesystem::path& pattern);

} // namespace storage
