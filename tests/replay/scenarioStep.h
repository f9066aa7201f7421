// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "Case.h"
#include "ScenarioScene.h"

namespace replay {

// The geometry that a step is about.
unsigned indexOf(Input& step);

// Does one step (README.md lists them) and gives what is observed after it, but for messages and standard output.
// Throws std::runtime_error when the step is not known or nothing reads one of its members.
Json runStep(Input& step, ScenarioScene& scene, JsonAllocator& allocator);

} // namespace replay
