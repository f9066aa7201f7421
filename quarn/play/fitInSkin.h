// SPDX-License-Identifier: Apache-2.0
// Shapes before a skin, for an error that is meant behind it.
#pragma once

#include "openquarn/HMatrix.h"
#include "quarn/play/fitClip.h"

#include <functional>

namespace quarn {

/// What the skin moves each vertex by, in a frame; only the upper left 3 x 3 parts count.
using SkinOfFrame = std::function<std::vector<HMatrix>(std::size_t frame)>;

/// As fitClip(), of differences before a skin: their principal shapes, as few as keep every vertex within `allowed`
/// however much the skin stretches it anywhere; `error` is what is left behind the skin, in the unit there.
FittedClip fitInSkin(const std::vector<ClipShape>& frames, double allowed, const SkinOfFrame& skin);

} // namespace quarn
