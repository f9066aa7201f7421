// SPDX-License-Identifier: Apache-2.0
// Kinds of deltas beside each other, measured on the frames of a scene before anything is trained.
#pragma once

#include "quarn/console/Console.h"
#include "quarn/dataset/DeltaKind.h"
#include "quarn/scene/Warp.h"
#include "quarn/scene/frames.h"

#include "quill/IndexMapper.h"

#include <cstddef>
#include <vector>

namespace OpenQuarn {
class Session;
}

namespace quarn {

/// Of one kind. Lengths are measured on the deformed mesh, in units of the scene; no number where a target is none.
struct KindFigures {
    DeltaKind kind;
    double mean = 0.0; ///< error of a fit of these deltas to the controls (ControlFit), in frames that it has not seen
    double p99 = 0.0;  ///< the same, of all vertices and frames
    double jitter = 0.0; ///< of the fit minus the skin: the largest second difference of a vertex on the path
    double turn = 0.0;   ///< the largest angle by which the frame of a vertex turns in a step of the path, in degrees
};

struct SmoothingStudy {
    std::size_t fitted = 0, tested = 0; ///< frames
    std::size_t steps = 0;              ///< of the path
    std::vector<KindFigures> kinds;     ///< in the order in which they were given
};

/// The least number of frames that can be studied.
inline constexpr std::size_t leastStudied = 12;

/// Measures kinds of deltas on at most 256 of the frames and 2048 of the deformed vertices, and on a path: eight pieces
/// of 24 steps, of the frames as they follow, or, where poses hold from key to key, between a pose and the next. The
/// scene is at another time afterwards, and otherwise as it was.
///   map     of the deformer, with a vertex at least
///   frames  leastStudied of them, or more
///   kinds   one or more, none with fewer than 0 passes
/// Throws std::runtime_error for what cannot be evaluated, and Interrupted. Thread: main.
SmoothingStudy studySmoothing(OpenQuarn::Session& host, const Warp& warp, const WarpGeometry& geometry,
                              const quill::IndexMapper& map, const FrameRange& frames,
                              const std::vector<DeltaKind>& kinds, const Console& console);

} // namespace quarn
