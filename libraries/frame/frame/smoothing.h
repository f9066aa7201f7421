// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "frame/FrameModel.h"

#include <cstdint>
#include <functional>

namespace neuralWarp {

/// Whether long work is to be given up; empty: never. Asked now and then, on the calling thread. Must not throw.
using IsCancelled = std::function<bool()>;

/// Smooths points as deltas are meant: with the neighbours of the rest shape, all the way in each pass.
///   points  in and out, object space, one per deformed vertex; any other number stays as it is
///   passes  0 and less: none
/// Throws quill::Cancelled, and std::bad_alloc for its scratch array. [any]
void smoothPoints(Points& points, const RestSurface& rest, std::int64_t passes, const IsCancelled& isCancelled = {});

} // namespace neuralWarp
