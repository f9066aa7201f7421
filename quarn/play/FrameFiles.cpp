// SPDX-License-Identifier: Apache-2.0
#include "quarn/play/FrameFiles.h"

#include "quarn/console/UsageError.h"
#include "quarn/play/GrowingCache.h"
#include "quarn/play/meshFiles.h"
#include "storage/CacheFormat.h"
#include "storage/PointCacheWriter.h"
#include "storage/WholeFile.h"
#include "storage/framePattern.h"

#include <stdexcept>

namespace quarn {
namespace {

bool isCache(const std::filesystem::path& path) {
    const auto format = storage::cacheFormatOf(path);
    return format && *format != storage::CacheFormat::obj; // these are written one by one
}

// Alembic, and USD's binary forms, are asked for by users who have a way through other files
std::string adviceFor(const std::string& ending) {
    const bool isNear = ending == ".abc" || ending == ".usd" || ending == ".usdc" || ending == ".usdz";
    return isNear ? ". What reads " + ending + " reads .usda or .pc2, which are" : "";
}

ClipMotion motionOf(const FrameWriting& writing) {
    return {writing.meshName,
            writing.frames,
            writing.framesPerSecond,
            writing.metersPerUnit * writing.space.scale,
            writing.space.axes == "z",
            writing.allowedError,
            writing.source};
}

} // namespace

void checkFramePattern(const std::filesystem::path& pattern, const FrameRange& frames) {
    using storage::WholeFile;
    if (isCache(pattern))
        return WholeFile::requirePossible(pattern, WholeFile::Writes::anywhere);
    if (isAnimatedFile(pattern, frames.count()))
        return WholeFile::requirePossible(pattern);
    if (!isMeshFile(pattern))
        throw UsageError("\"" + pattern.string() +
                         "\" is no file that is written here: its name ends in .npy, .npz, .pc2, .mdd, .obj, .ply, "
                         ".gltf, .glb or .usda" +
                         adviceFor(pattern.extension().string()));
    if (frames.count() > 1 && !storage::isFramePattern(pattern))
        throw UsageError("\"" + pattern.string() + "\" would be written for each of " + std::to_string(frames.count()) +
                         " frames: put #### where the number of the frame goes, as in \"" + pattern.stem().string() +
                         ".####" + pattern.extension().string() + "\"");
    WholeFile::requirePossible(storage::frameFile(pattern, frames.first));
}

bool isFileOfEachFrame(const std::filesystem::path& pattern, const FrameRange& frames) {
    return !isCache(pattern) && !isAnimatedFile(pattern, frames.count());
}

FrameFiles::FrameFiles(std::filesystem::path pattern, const MeshPolygons& polygons, FrameWriting writing)
    : pattern_(std::move(pattern))
    , writing_(std::move(writing)) {
    const FrameRange& frames = writing_.frames;
    if (writing_.cache != nullptr)
        return;
    if (isAnimatedFile(pattern_, frames.count())) {
        animated_ = createAnimatedFile(pattern_, writing_.order.polygons(polygons), motionOf(writing_));
        return;
    }
    if (!isCache(pattern_)) {
        polygons_ = writing_.order.polygons(polygons);
        return;
    }
    const std::vector<float> any(3 * polygons.vertexCount);
    const storage::CacheTiming timing{frames.count(), static_cast<double>(frames.first),
                                      static_cast<double>(frames.step), writing_.framesPerSecond};
    cache_ = storage::createPointCache(pattern_.string(), writing_.order.points(any).size() / 3, timing);
}

FrameFiles::~FrameFiles() = default;

std::span<const float> FrameFiles::written(std::span<const float> xyz) {
    const std::span<const float> ordered = writing_.order.points(xyz);
    if (writing_.space.isTheScenes())
        return ordered;
    moved_.assign(ordered.begin(), ordered.end());
    writing_.space.toCache(moved_);
    return moved_;
}

void FrameFiles::add(int frame, std::span<const float> xyz) {
    if (writing_.cache != nullptr)
        writing_.cache->append(written(xyz));
    else if (cache_)
        cache_->append(written(xyz));
    else if (animated_)
        animated_->add(frame, written(xyz));
    else
        writeMeshFile(storage::frameFile(pattern_, frame), written(xyz), polygons_);
}

void FrameFiles::finish() {
    if (cache_)
        cache_->finish();
    if (animated_)
        animated_->finish();
}

} // namespace quarn
