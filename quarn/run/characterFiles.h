// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <filesystem>
#include <vector>

namespace quarn {

/// The file of a character and, of a .gltf, the files of its buffers that are there: what a change of means another
/// character. Of a file that cannot be read, itself alone.
std::vector<std::filesystem::path> characterFiles(const std::filesystem::path& character);

} // namespace quarn
