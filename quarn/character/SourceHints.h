// SPDX-License-Identifier: Apache-2.0
// What a file says and the importer does not pass on.
#pragma once

#include "quarn/character/Character.h"

#include <cstddef>
#include <cstdlib>
#include <map>
#include <set>
#include <string>
#include <tuple>
#include <vector>

namespace quarn {

enum class TrackKind { Translation, Rotation, Scale };

/// A morph target of a mesh, in the file's vertices.
struct SourceTarget {
    std::string name;                       ///< may be empty
    std::vector<std::vector<float>> deltas; ///< by part of the mesh: x, y, z of every vertex, or nothing
};

/// What is shown at a node with morph targets.
struct SourceMorphs {
    std::size_t mesh = 0;        ///< index into SourceHints::targets
    std::vector<double> weights; ///< at rest, one a target
};

/// The weights over time of the targets at a node.
struct SourceMorphTrack {
    std::size_t animation = 0;
    std::string node; ///< importer's name
    bool isStep = false;
    std::vector<float> seconds;
    std::vector<float> weights; ///< of every time one a target
};

struct SourceHints {
    /// From the importer's name of a node to that of the file, which may be empty or stand twice. A node that is not
    /// here has its own name.
    std::map<std::string, std::string> nodeNames;
    /// The tracks that do not interpolate: index of the animation, importer's name of the node, kind.
    std::set<std::tuple<std::size_t, std::string, TrackKind>> stepTracks;
    std::map<std::size_t, std::vector<SourceTarget>> targets; ///< by mesh of the file, where it has some
    std::map<std::string, SourceMorphs> morphs;               ///< by importer's name of the node
    std::vector<SourceMorphTrack> morphTracks;
    std::vector<std::string> warnings;

    std::string nodeName(const std::string& imported) const {
        const auto found = nodeNames.find(imported);
        return found == nodeNames.end() ? imported : found->second;
    }
    /// The file's index of a node by its importer's name; -1 where the file has no such indices.
    int nodeIndex(const std::string& imported) const {
        return nodeNames.count(imported) == 0 ? -1 : std::atoi(imported.c_str() + 1); // see nodeId()
    }
};

} // namespace quarn
