// SPDX-License-Identifier: Apache-2.0
#include "quarn/render/pictureNames.h"

#include "quarn/console/UsageError.h"
#include "storage/WholeFile.h"
#include "storage/framePattern.h"

#include <algorithm>
#include <stdexcept>
#include <string>

namespace quarn {
namespace {

namespace fs = std::filesystem;

} // namespace

fs::path pictureName(const fs::path& pattern, int frame, bool several) {
    if (!several || storage::isFramePattern(pattern))
        return storage::frameFile(pattern, frame);
    if (storage::isWrittenThrough(pattern))
        throw std::runtime_error(pattern.string() + " takes one picture, and more than one frame is to be drawn");
    const std::string numbered = pattern.stem().string() + ".####" + pattern.extension().string();
    return storage::frameFile(pattern.parent_path() / numbered, frame);
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
