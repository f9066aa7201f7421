// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "quarn/dataset/FrameSampler.h"
#include "quarn/scene/PartFrames.h"
#include "quarn/scene/Setup.h"

#include <filesystem>

namespace quarn {

/// The set-up of an export from the open scene, whose file (absolute) is read. Of files that the scene reads, such as
/// point caches, size and time of change stand for what is in them. Throws std::runtime_error. Thread: main.
Setup sceneSetup(const std::filesystem::path& sceneFile, const Warp& warp, const WarpGeometry& geometry,
                 const FrameSampler& sampler, const PartFrames& frames);

} // namespace quarn
