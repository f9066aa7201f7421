// SPDX-License-Identifier: Apache-2.0
// What a file says and the importer does not pass on.
#pragma once

#include "quarn/character/Character.h"

#include <cstddef>
#include <map>
#include <set>
#include <string>
#include <tuple>
#include <vector>

namespace quarn {

enum class TrackKind { Translation, Rotation, Scale };

struct SourceHints {
    /// From the importer's name of a node to that of the file, which may be empty or stand twice. A node that is not
    /// here has its own name.
    std::map<std::string, std::string> nodeNames;
    /// The tracks that do not interpolate: index of the animation, importer's name of the node, kind.
    std::set<std::tuple<std::size_t, std::string, TrackKind>> stepTracks;
    std::vector<std::string> warnings;

    std::string nodeName(const std::string& imported) const {
        const auto found = nodeNames.find(imported);
        return found == nodeNames.end() ? imported : found->second;
    }
};

} // namespace quarn
