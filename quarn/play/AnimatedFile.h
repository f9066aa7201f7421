// SPDX-License-Identifier: Apache-2.0
// One file that holds a whole motion of a mesh, and its polygons.
#pragma once

#include "quarn/play/ClipSource.h"
#include "quarn/scene/frames.h"
#include "quarn/scene/meshes.h"

#include <cstdint>
#include <filesystem>
#include <memory>
#include <optional>
#include <span>
#include <string>
#include <vector>

namespace quarn {

/// What is known of a motion before its first frame.
struct ClipMotion {
    std::string meshName;
    FrameRange frames; ///< all that are going to be added
    double framesPerSecond = 24.0;
    double metersPerUnit = 1.0; ///< of the positions as they are added
    bool isZUp = false;         ///< else y is up
    std::optional<double> allowedError =
        {}; ///< in millimetres, above 0: as few shapes as it allows, where there are any
    std::shared_ptr<ClipSource> source = {}; ///< the file that the motion is put into; none: a file of the mesh alone
};

/// How many shapes stand for a motion, and how far from it that is at most, in millimetres.
struct ShapesOfMotion {
    std::size_t count = 0;
    double error = 0.0;
};

/// There as a whole or not at all: nothing is left without finish(). Thread: one at a time.
class AnimatedFile {
public:
    virtual ~AnimatedFile() = default;
    /// Of the whole file; an estimate.
    virtual std::uint64_t expectedBytes() const = 0;
    /// `xyz` 3 * polygons.vertexCount finite numbers. Frames come in the order of the motion.
    virtual void add(int frame, std::span<const float> xyz) = 0;
    /// Called once, after the last frame. Throws storage::FileError, and std::runtime_error that names the file.
    virtual void finish() = 0;
    /// After finish(); none where the file has no shapes that were fitted.
    virtual std::optional<ShapesOfMotion> shapes() const { return std::nullopt; }
    /// After finish(): what the user should know, sentences without a full stop.
    virtual std::vector<std::string> notes() const { return {}; }
};

/// Whether a file of this name holds all frames of a play: ".usda", and ".glb" without "#" where there are several.
bool isAnimatedFile(const std::filesystem::path& path, std::size_t frameCount);
/// `polygons` of the frames that are going to be added; with a source in the order of the scene. Throws
/// storage::FileError where the file cannot be put into its place, and std::runtime_error, naming the path, where its
/// format cannot hold the motion.
std::unique_ptr<AnimatedFile> createAnimatedFile(const std::filesystem::path& path, MeshPolygons polygons,
                                                 ClipMotion motion);

} // namespace quarn
