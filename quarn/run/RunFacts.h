// SPDX-License-Identifier: Apache-2.0
// What steps that are done have answered, and later ones are made of.
#pragma once

#include <filesystem>
#include <map>
#include <optional>
#include <string>
#include <vector>

namespace quarn {

/// A geometry of the deformer, in the order of these.
struct MeshFacts {
    std::string name, skin;       ///< nodes: the mesh, and what moves it
    std::size_t vertices = 0;     ///< of the scene
    std::size_t fileVertices = 0; ///< before they were joined
};

struct CharacterFacts {
    double metersPerUnit = 1.0;
    std::vector<MeshFacts> meshes;
};

struct FrameSpan {
    int first = 0, last = 0;
    int count() const { return last - first + 1; }
};

/// A cache as it is connected: its node, the file that the scene plays, and how far that is from the skin.
struct CacheFacts {
    std::string node;
    std::filesystem::path cache;
    std::optional<double> meanMm, largestMm; ///< where they were compared
};

struct TargetFacts : CacheFacts {
    std::optional<CacheFacts> skin; ///< what stands in for quarn's own, and how far from that it is
};

struct RunFacts {
    std::optional<CharacterFacts> character;
    std::optional<FrameSpan> poses, motion;
    std::vector<FrameSpan> refined;             ///< all poses after each round that has added some
    std::map<std::string, TargetFacts> targets; ///< by answerFile()
    bool areLimitsEdited = false;               ///< the run's own limits.json is not as the import has left it
};

/// The name by which the answer of a step of a round is kept.
std::string ofRound(const std::string& step, std::size_t round);

/// Where the answer of a step lies in the run's folder; `mesh` as in Step, or empty.
std::filesystem::path answerFile(const std::string& step, const std::string& mesh = {});

/// As far as answers are in the folder; without `areLimitsEdited`. One that cannot be read counts as none: its step is
/// done again for that.
RunFacts readFacts(const std::filesystem::path& folder);

} // namespace quarn
