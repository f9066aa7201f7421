// SPDX-License-Identifier: Apache-2.0
#include "quarn/render/pictureNames.h"

#include "quarn/console/UsageError.h"
#include "storage/WholeFile.h"

#include <algorithm>
#include <cstdlib>
#include <stdexcept>
#include <string>

namespace quarn {
namespace {

namespace fs = std::filesystem;

// -7 in 4 digits is -0007
std::string padded(int frame, std::size_t digits) {
    std::string text = std::to_string(std::abs(frame));
    text.insert(0, digits - std::min(digits, text.size()), '0');
    return (frame < 0 ? "-" : "") + text;
}

} // namespace

fs::path pictureName(const fs::path& pattern, int frame, bool several) {
    std::string name = pattern.filename().string();
    const std::size_t last = name.rfind('#');
    if (last != std::string::npos) {
        const std::size_t before = name.find_last_not_of('#', last);
        const std::size_t first = before == std::string::npos ? 0 : before + 1;
        name.replace(first, last - first + 1, padded(frame, last - first + 1));
    } else if (several && storage::isWrittenThrough(pattern)) {
        throw std::runtime_error(pattern.string() + " takes one picture, and more than one frame is to be drawn");
    } else if (several) {
        name = pattern.stem().string() + "." + padded(frame, 4) + pattern.extension().string();
    }
    return pattern.parent_path() / name;
}

void checkPictureName(const fs::path& pattern) {
    std::string ending = pattern.extension().string();
    std::transform(ending.begin(), ending.end(), ending.begin(),
                   [](unsigned char letter) { return static_cast<char>(std::tolower(letter)); });
    if (ending != ".png" && !storage::isWrittenThrough(pattern))
        throw UsageError(pattern.string() + " is no name of a picture: it must end in .png");
    storage::WholeFile::requirePossible(pattern);
}

} // namespace quarn
