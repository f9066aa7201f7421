// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "Case.h"

#include <string_view>

namespace replay {

// Runs one case's input through the real code and gives the values in the form of the case's "expected".
using Replay = Json (*)(Input& input, JsonAllocator& allocator);

Json replayVal3(Input& input, JsonAllocator& allocator);
Json replayMatrix(Input& input, JsonAllocator& allocator);
Json replayMesh(Input& input, JsonAllocator& allocator);
Json replayMetadata(Input& input, JsonAllocator& allocator);
Json replayPrincipal(Input& input, JsonAllocator& allocator);
Json replayCollector(Input& input, JsonAllocator& allocator);
Json replayConverter(Input& input, JsonAllocator& allocator);
Json replayOrtho(Input& input, JsonAllocator& allocator);
Json replayScenario(Input& input, JsonAllocator& allocator);

struct Kind {
    std::string_view name;
    Replay replay;
};

inline constexpr Kind kinds[] = {
    {"val3", replayVal3},           {"matrix", replayMatrix},       {"mesh", replayMesh},
    {"metadata", replayMetadata},   {"principal", replayPrincipal}, {"collector", replayCollector},
    {"converter", replayConverter}, {"ortho", replayOrtho},         {"scenario", replayScenario},
};

} // namespace replay
