// SPDX-License-Identifier: Apache-2.0
#include "quarn/scene/units.h"

#include "quarn/scene/plugs.h"

namespace quarn {

double metersPerUnit() {
    const std::vector<HObject> characters = nodesOfType("character");
    return characters.empty() ? 1.0 : numberOf(plugOf(characters.front(), "metersPerUnit"));
}

std::optional<double> framesPerSecond() {
    const std::vector<HObject> characters = nodesOfType("character");
    if (characters.empty())
        return std::nullopt;
    const double rate = numberOf(plugOf(characters.front(), "framesPerSecond"));
    return rate > 0.0 ? std::optional(rate) : std::nullopt;
}

} // namespace quarn
