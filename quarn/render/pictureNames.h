// SPDX-License-Identifier: Apache-2.0
// The names of the pictures of a range of frames.
#pragma once

#include <filesystem>

namespace quarn {

/// The file of a frame, as storage::frameFile() names it. Without a "#", and where there are `several` frames, the
/// frame with 4 digits goes before the ending: "pic.0007.png".
std::filesystem::path pictureName(const std::filesystem::path& pattern, int frame, bool several);

/// Throws std::runtime_error, naming it, for a name that does not end in .png and a folder that does not exist.
void checkPictureName(const std::filesystem::path& pattern);

} // namespace quarn
