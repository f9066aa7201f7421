// SPDX-License-Identifier: Apache-2.0
// Which frames of a scene hold poses that were drawn, each for itself.
#pragma once

#include "quarn/scene/frames.h"

#include <optional>

namespace quarn {

/// Of `exported`, from the first to the last whose pose `quarn pose` drew, as it has noted on the curves: drawnKeys of
/// an animCurve. The frames between them are drawn as well. None where no frame is known to be. Thread: main.
std::optional<FrameRange> drawnFrames(const FrameRange& exported);

} // namespace quarn
