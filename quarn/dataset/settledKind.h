// SPDX-License-Identifier: Apache-2.0
// Which kind of deltas an export takes, where its flags say more than the scene.
#pragma once

#include "quarn/dataset/FrameSampler.h"
#include "quarn/dataset/exportDatasets.h"

namespace quarn {

/// Sets export[i] of the open scene: with options.like to what that data set has; with options.smoothing to what a
/// study of the frames speaks for, which is the answer then. With neither, and for fewer than leastStudied frames,
/// which a note says, the scene's kind stays. Throws std::runtime_error for a folder without a data set, and what the
/// study throws. Thread: main.
std::optional<KindChoice> settleKind(OpenQuarn::Session& host, const Warp& warp, const WarpGeometry& geometry,
                                     const FrameRange& frames, const ExportOptions& options);

/// Warns of Surface deltas that would move in jumps; says nothing of fewer than leastStudied frames, nor of frames that
/// cannot be evaluated. The scene is at another time afterwards. Throws Interrupted. Thread: main.
void warnOfJumps(OpenQuarn::Session& host, const Warp& warp, const WarpGeometry& geometry, const FrameSampler& sampler,
                 const FrameRange& frames, const Console& console);

} // namespace quarn
