// SPDX-License-Identifier: Apache-2.0
// A row of a report is measured: the scene is played, and compared with its target.
#pragma once

#include "quarn/report/MeshErrors.h"
#include "quarn/report/RowRequest.h"
#include "quarn/scene/FrameTimes.h"
#include "quarn/scene/PoseWatch.h"
#include "quarn/scene/frames.h"

#include <optional>
#include <string>
#include <vector>

namespace quarn {

struct Console;

/// The model, as its directory says.
struct ModelFacts {
    std::string name, note;                                   ///< the note is useModel.h's
    bool isTheScenes = false;                                 ///< the scene has it switched on
    std::string mode, kind;                                   ///< "surface" or "offset"; "principal" or "direct"
    std::uint64_t smoothing = 0;                              ///< passes
    std::uint64_t shapes = 0;                                 ///< principal ones
    std::optional<std::uint64_t> controls, poses;             ///< of the network; trained. None without a certificate
    std::vector<std::pair<std::string, std::uint64_t>> files; ///< and their bytes
    std::uint64_t bytes() const;
};

/// How the GPU did the same.
struct GpuRun {
    std::string device;
    std::uint64_t deformations = 0, fallbacks = 0;
    FrameTimes times;
    MeshErrors difference; ///< from the points of the CPU
};

struct MeasuredRow {
    /// `millimetres`: of a unit of the scene.
    explicit MeasuredRow(double millimetres)
        : before(millimetres)
        , after(millimetres) {}

    std::string name, deformer, mesh; ///< nodes: the deformer, the mesh
    std::filesystem::path scene;      ///< whole
    std::string skinPlug, targetPlug, meshPlug;
    FrameRange frames;
    std::size_t vertices = 0;
    double diagonal = 0.0; ///< of the box of the rest mesh, mm; 0 where it has none
    ModelFacts model;
    MeshErrors before, after;  ///< what comes into the deformer, and what it gives out
    double targetJitter = 0.0; ///< mm
    /// The joint that moves the worst vertex most; empty where no skin of the scene says so.
    std::string jointBefore, jointAfter;
    FrameTimes cpu;
    std::optional<GpuRun> gpu; ///< none: there is no device
    std::vector<PoseReport> poses;
};

/// How rows are measured.
struct Measuring {
    std::vector<std::string> plugins;
    int threads = 0;
    int repeats = 3; ///< each scene is played so often; the first time is not timed where there are several
};

/// Throws std::runtime_error with the sentence for the user, and Interrupted. Thread: main.
MeasuredRow measureRow(const RowRequest& request, const Measuring& measuring, const Console& console);

} // namespace quarn
