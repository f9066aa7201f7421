// SPDX-License-Identifier: Apache-2.0
// Poses out: what a scene does over a range of frames as a file for other programs.
#pragma once

#include "quarn/console/Console.h"
#include "quarn/scene/Warp.h"
#include "quarn/scene/frames.h"

#include <filesystem>
#include <optional>
#include <string>
#include <vector>

namespace quarn {

struct PosesFileOptions {
    std::filesystem::path file; ///< empty: none is written
    int frameOffset = 0;        ///< added to the numbers of the frames
};

/// What was written, for the user.
struct PosesFileReport {
    std::filesystem::path file;
    std::size_t frames = 0;
    std::size_t joints = 0;
    std::size_t plugs = 0;  ///< that move, or are sampled
    std::size_t meshes = 0; ///< of a .glb
    int sceneFirst = 1;     ///< frame of the scene that comes first
    std::string place;      ///< where it lies in the file: "frame 1", "second 0, at 24 frames a second" and the like
};

/// To be asked before anything is computed. Throws UsageError for an ending that is none of .glb, .json and .csv, and
/// for a file that is one of `scenes`, which are read or written (empty paths are passed over); storage::FileError for
/// a place where no file can be put.
void requirePosesFile(const PosesFileOptions& options, const std::vector<std::filesystem::path>& scenes);

/// Throws std::runtime_error when the frame would lie before the beginning of the file. Thread: main.
void requirePlace(const PosesFileOptions& options, int firstFrame);

/// The frames that a scene is about: those that its deformer exports, once somebody has set them; else from the first
/// to the last key of its curves. Throws std::runtime_error when there are none. Thread: main.
FrameRange framesOfScene(const std::optional<Warp>& warp);

/// Writes the file as a whole, in the format of its ending; what is not in it is noted on the console. The scene stays
/// as it is. Throws std::runtime_error that names the file, and Interrupted. Thread: main.
PosesFileReport writePoses(const PosesFileOptions& options, const std::optional<Warp>& warp, const FrameRange& frames,
                           const Console& console);

} // namespace quarn
