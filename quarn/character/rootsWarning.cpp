// SPDX-License-Identifier: Apache-2.0
#include "quarn/character/rootsWarning.h"

namespace quarn {

std::string rootsWarning(const Character& character) {
    std::string names;
    std::size_t count = 0;
    for (const Joint& joint : character.joints) {
        if (joint.parent >= 0)
            continue;
        names += (count++ == 0 ? "\"" : ", \"") + joint.name + "\"";
    }
    return count > 1 ? "the skeleton has " + std::to_string(count) + " roots: " + names : "";
}

} // namespace quarn
