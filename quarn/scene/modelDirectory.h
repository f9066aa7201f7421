// SPDX-License-Identifier: Apache-2.0
// Where the model of a deformed geometry lies.
#pragma once

#include <filesystem>

namespace quarn {

struct Warp;
struct WarpGeometry;

/// The deformer's modelRoot joined with models[i].modelName, its extension replaced by ".nwrp"; empty while one of the
/// two is. Nothing is looked up. Thread: main.
std::filesystem::path modelDirectory(const Warp& warp, const WarpGeometry& geometry);
/// Throws std::runtime_error when there is no such directory: where it was looked for, and which models there are.
void requireModelDirectory(const Warp& warp, const WarpGeometry& geometry);
/// models[i].modelActive is On.
bool isModelActive(const Warp& warp, const WarpGeometry& geometry);

} // namespace quarn
