// SPDX-License-Identifier: Apache-2.0
#include "storage/framePattern.h"

#include <algorithm>
#include <cstdlib>
#include <string>

namespace storage {

bool isFramePattern(const std::filesystem::path& path) {
    return path.filename().string().find('#') != std::string::npos;
}

std::filesystem::path frameFile(const std::filesystem::path& pattern, int frame) {
    std::string name = pattern.filename().string();
    const std::size_t last = name.rfind('#');
    if (last == std::string::npos)
        return pattern;
    const std::size_t first = name.find_last_not_of('#', last) + 1; // npos + 1 is 0
    const std::size_t length = last + 1 - first;
    std::string digits = std::to_string(std::abs(frame));
    digits.insert(0, length - std::min(length, digits.size()), '0');
    return pattern.parent_path() / name.replace(first, length, (frame < 0 ? "-" : "") + digits);
}

} // namespace storage
