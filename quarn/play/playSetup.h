// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "quarn/scene/Setup.h"

namespace quarn {

struct PartFrames;
struct PlayPlan;

/// All that the written points of a plan depend on, but for their number: what they are of, the frames, how they are
/// written, and the files that are read for them, those of the models behind the mesh that are on among them. Throws
/// std::runtime_error when the scene's file cannot be read. Thread: main.
Setup playSetup(const PlayPlan& plan, const PartFrames& frames);

} // namespace quarn
