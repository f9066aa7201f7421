// SPDX-License-Identifier: Apache-2.0
// The flags and counters of a geometry's state, as tests compare them.
#pragma once

#include "deformer/neuralWarpData.h"

#include <gmock/gmock.h>

#include <array>
#include <string>
#include <utility>
#include <vector>

namespace stateText {

using Flag = std::pair<const char*, bool neuralWarp::neuralWarpData::*>;
using State = neuralWarp::neuralWarpData;

inline constexpr std::array<Flag, 11> flags = {{
    {"topology", &State::framesTopologyDirty},
    {"indexMap", &State::indexMapDirty},
    {"connections", &State::connectionsDirty},
    {"restFrames", &State::restFramesDirty},
    {"load", &State::modelLoadPending},
    {"metadata", &State::metadataDirty},
    {"path", &State::modelPathDirty},
    {"applied", &State::modelApplied},
    {"export", &State::exportMode},
    {"valid", &State::modelValid},
    {"affectMap", &State::useAffectMap},
}};

/// The flags that are raised, in the order above: "topology load valid".
inline std::string raised(const State& state) {
    std::string text;
    for (const auto& [name, member] : flags)
        if (state.*member)
            text += (text.empty() ? "" : " ") + std::string(name);
    return text;
}

/// Raises these flags, and lowers all others.
inline void raise(State& state, const std::string& names) {
    for (const auto& [name, member] : flags)
        state.*member = (" " + names + " ").find(" " + std::string(name) + " ") != std::string::npos;
}

} // namespace stateText
