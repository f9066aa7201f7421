// SPDX-License-Identifier: Apache-2.0
// Played frames on the disk: a point cache or an animated file of all of them, or a mesh file of each.
#pragma once

#include "quarn/play/AnimatedFile.h"
#include "quarn/play/VertexOrder.h"
#include "quarn/scene/CacheSpace.h"
#include "quarn/scene/frames.h"
#include "quarn/scene/meshes.h"

#include <filesystem>
#include <memory>
#include <span>
#include <string>
#include <vector>

namespace storage {
class PointCacheWriter;
}

namespace quarn {

class GrowingCache;

/// Throws std::runtime_error when the ending is none that is written, and for a mesh file without "#" where there are
/// several frames. Before anything is played.
void checkFramePattern(const std::filesystem::path& pattern, const FrameRange& frames);

/// Whether each of these frames is written to a file of its own.
bool isFileOfEachFrame(const std::filesystem::path& pattern, const FrameRange& frames);

/// How frames are written.
struct FrameWriting {
    VertexOrder order;
    CacheSpace space;
    FrameRange frames;                       ///< all that are going to be added
    double framesPerSecond = 24.0;           ///< above 0
    std::string meshName = {};               ///< as animated files call it
    double metersPerUnit = 1.0;              ///< of the scene
    std::optional<double> allowedError = {}; ///< as of a ClipMotion
    std::shared_ptr<ClipSource> source = {}; ///< the same; with it order and space are the scene's
    GrowingCache* cache = nullptr;           ///< what gets the frames of a .npy; null: a file that comes as a whole
};

/// Every file is there as a whole or not at all; of those of all frames nothing is left without finish(), but for a
/// GrowingCache, which its owner publishes. Thread: main.
class FrameFiles {
public:
    /// `polygons` of the scene's mesh.
    FrameFiles(std::filesystem::path pattern, const MeshPolygons& polygons, FrameWriting writing);
    ~FrameFiles();
    FrameFiles(const FrameFiles&) = delete;
    FrameFiles& operator=(const FrameFiles&) = delete;

    /// Of a file that is larger than its numbers, before its frames; 0 for others.
    std::uint64_t expectedBytes() const { return animated_ ? animated_->expectedBytes() : 0; }
    /// `xyz` in the scene's order, space and unit. Throws std::runtime_error that names the file.
    void add(int frame, std::span<const float> xyz);
    void finish();
    /// `xyz` as it is written, in the order, space and unit of the files. Valid until the next call.
    std::span<const float> written(std::span<const float> xyz);
    /// As of an AnimatedFile.
    std::optional<ShapesOfMotion> shapes() const { return animated_ ? animated_->shapes() : std::nullopt; }
    std::vector<std::string> notes() const { return animated_ ? animated_->notes() : std::vector<std::string>(); }

private:
    std::filesystem::path pattern_;
    FrameWriting writing_;
    MeshPolygons polygons_; ///< only for mesh files
    std::unique_ptr<storage::PointCacheWriter> cache_;
    std::unique_ptr<AnimatedFile> animated_;
    std::vector<float> moved_;
};

} // namespace quarn
