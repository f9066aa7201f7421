// SPDX-License-Identifier: Apache-2.0
// Playing a mesh over a range of frames: what is timed, compared and written on the way.
#pragma once

#include "openquarn/HPlug.h"
#include "quarn/play/AnimatedFile.h"
#include "quarn/play/VertexOrder.h"
#include "quarn/scene/CacheSpace.h"
#include "quarn/scene/Distances.h"
#include "quarn/scene/EnvelopeGuard.h"
#include "quarn/scene/FrameTimes.h"
#include "quarn/scene/PartFrames.h"
#include "quarn/scene/PoseWatch.h"
#include "quarn/scene/evaluator.h"
#include "quarn/scene/frames.h"
#include "quarn/scene/useModel.h"

#include <filesystem>
#include <map>
#include <optional>
#include <string>
#include <vector>

namespace quarn {

struct Console;
class SceneSession;

/// What is played.
struct PlayPlan {
    HPlug mesh;
    FrameRange frames;
    PartOptions part;                       ///< the whole that the frames are of, and what is evaluated before them
    std::filesystem::path scene;            ///< its file; empty: it has none
    int repeats = 1;                        ///< above 0; the first is not timed where there are several
    std::filesystem::path output;           ///< pattern as for FrameFiles; empty: nothing is written
    bool replacesBegun = false;             ///< a .npy that was begun with another set-up is given up
    bool leavesExisting = false;            ///< frames whose file is there are neither evaluated nor written
    VertexOrder order;                      ///< of what is written
    CacheSpace space;                       ///< the same
    std::string meshName;                   ///< in animated files
    bool isAnySizeWritten = false;          ///< also what is far larger than the motion is worth
    std::optional<double> allowedError;     ///< as of a ClipMotion
    std::shared_ptr<ClipSource> source;     ///< the same
    bool isOnGpu = false;                   ///< chooseEvaluator() was told so
    std::filesystem::path trace;            ///< recording of all that is timed; empty: none
    HPlug against;                          ///< mesh to compare with; null: none
    HPlug before;                           ///< compared as well, where there is `against`; may be null
    ModelInUse model;                       ///< that was chosen for the mesh; only to be told
    std::optional<double> guardWidth;       ///< of an EnvelopeGuard of the mesh; none: it has none
    std::optional<std::vector<float>> rest; ///< whose box lengths are compared with; none: `against` in the first frame
};

/// A mesh compared with `against`, in units of the scene.
struct Comparison {
    Distances distances;
    Jitter jitter;
};

struct PlayResult {
    std::size_t vertexCount = 0;
    std::size_t framesKept = 0;    ///< an earlier run has written: the rest of this is not about them
    std::size_t framesSkipped = 0; ///< whose file was there, the same
    FrameTimes times;
    std::map<std::string, std::vector<double>> phases; ///< seconds; only with a trace
    std::optional<GpuUse> gpu;                         ///< none: the GPU was not asked for
    std::optional<Comparison> mesh, before;
    Jitter targetJitter;
    double boxDiagonal = 0.0;             ///< 0 without a comparison
    std::optional<ShapesOfMotion> shapes; ///< none: nothing was written that has fitted ones
    std::vector<GuardReport> guard;       ///< empty without a guard
    std::vector<PoseReport> poses;        ///< of the models that were on
};

/// Throws std::runtime_error, with the frame, for what fails on the way, and Interrupted. A .npy is gone on from where
/// an earlier run of the same set-up has left it (GrowingCache), unless all frames are to be compared, repeated or
/// recorded. Thread: main.
PlayResult playFrames(SceneSession& session, PlayPlan plan, const Console& console);

} // namespace quarn
