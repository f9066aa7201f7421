// SPDX-License-Identifier: Apache-2.0
// Where the deformers of a play run.
#pragma once

#include <cstdint>
#include <string>

namespace quarn {

/// "cpu" or "gpu"; `device` a number or a part of a name, empty for the first. Throws std::runtime_error when no loaded
/// plug-in has a GPU deformer, when there is no such device, and for a device without "gpu". Thread: main.
void chooseEvaluator(const std::string& evaluator, const std::string& device);

/// What the GPU had to do with a play.
struct GpuUse {
    std::string device;                 ///< empty: there is none
    std::uint64_t onGpu = 0, onCpu = 0; ///< geometries of deformers that can run there
    std::uint64_t fallbacks = 0;        ///< of `onCpu`, since the GPU failed
};

/// Since chooseEvaluator(). Thread: main.
GpuUse gpuUse();

} // namespace quarn
