// SPDX-License-Identifier: Apache-2.0
#include "quarn/play/AnimatedFile.h"

#include "quarn/play/ClipFile.h"
#include "quarn/play/SourceClip.h"
#include "quarn/play/UsdFile.h"
#include "storage/framePattern.h"

namespace quarn {

bool isAnimatedFile(const std::filesystem::path& path, std::size_t frameCount) {
    const bool isOneFile = !storage::isFramePattern(path);
    return path.extension() == ".usda" || (path.extension() == ".glb" && isOneFile && frameCount > 1);
}

std::unique_ptr<AnimatedFile> createAnimatedFile(const std::filesystem::path& path, MeshPolygons polygons,
                                                 ClipMotion motion) {
    if (path.extension() == ".usda")
        return std::make_unique<UsdFile>(path, polygons, std::move(motion));
    if (motion.source)
        return std::make_unique<SourceClip>(path, std::move(polygons), std::move(motion));
    return std::make_unique<ClipFile>(path, std::move(polygons), std::move(motion));
}

} // namespace quarn
