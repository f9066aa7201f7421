// SPDX-License-Identifier: Apache-2.0
// The names under which the plug-in's code reports failed host calls (HStatus::pAPIerror).
#pragma once

namespace neuralWarp::sourceUnit {

inline constexpr const char* node = "neuralWarp/neuralWarpNode";       ///< the deformer node
inline constexpr const char* gpuNode = "neuralWarp/neuralWarpGPUNode"; ///< its GPU deformer
inline constexpr const char* utils = "neuralWarp/neuralWarpUtils";     ///< the reading of control values

} // namespace neuralWarp::sourceUnit
