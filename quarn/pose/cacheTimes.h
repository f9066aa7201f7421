// SPDX-License-Identifier: Apache-2.0
// What a cache says of its frames, against how the scene plays them: one after another, a frame of the scene each.
#pragma once

#include "storage/PointCache.h"

#include <optional>
#include <string>
#include <vector>

namespace quarn {

/// A sentence, with both numbers, for everything in which the file's own times differ from being played from frame
/// `startFrame` on in a scene of `framesPerSecond` (none: it is not known, and nothing is compared with it): the rate,
/// spaces between frames that differ, the number of the first frame. An MDD that begins at 0 seconds does not say which
/// frame that is. Throws as PointCache::secondsOf() does. Thread: any.
std::vector<std::string> cacheTimesNotes(const storage::PointCache& cache, double startFrame,
                                         std::optional<double> framesPerSecond);

} // namespace quarn
