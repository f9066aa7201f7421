// SPDX-License-Identifier: Apache-2.0
#include "quarn/dataset/roomOnDisk.h"

#include <stdexcept>

#include <sys/statvfs.h>

namespace quarn {

void requireRoom(const std::filesystem::path& folder, std::uint64_t bytes, const std::string& what) {
    constexpr std::uint64_t roomForTexts = 1U << 20U;
    struct statvfs disk = {};
    if (::statvfs(folder.c_str(), &disk) != 0)
        return; // writing will tell
    const std::uint64_t free = std::uint64_t{disk.f_bavail} * disk.f_frsize;
    if (free < bytes + roomForTexts)
        throw std::runtime_error("the disk of " + folder.string() + " has " + std::to_string(free) +
                                 " bytes free, and " + what + " needs " + std::to_string(bytes + roomForTexts));
}

} // namespace quarn
