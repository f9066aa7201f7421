// SPDX-License-Identifier: Apache-2.0
// A sum of a rest mesh, by which a model tells whether it was trained on this one.
#pragma once

#include <string>

class HPlug;

namespace quarn {

/// "xxh3_128:" and the sum's digits, of the number of vertices, the corners of each polygon, their vertices, and the
/// points in single precision, in the scene's unit: UVs, names and tags do not count. Evaluates the plug; throws as
/// polygonsOf() does. Thread: main.
std::string meshSum(const HPlug& mesh);

} // namespace quarn
