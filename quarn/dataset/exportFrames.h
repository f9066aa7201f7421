// SPDX-License-Identifier: Apache-2.0
// Which frames of a scene are exported.
#pragma once

#include "quarn/scene/Warp.h"
#include "quarn/scene/frames.h"

#include <string>

namespace quarn {

/// What `text` says, as frameRange() reads it; without a text exportStartFrame to exportEndFrame of the deformer.
/// Throws std::runtime_error when these two are in the wrong order. Thread: main.
FrameRange exportFrames(const Warp& warp, const std::string& text);

} // namespace quarn
