// SPDX-License-Identifier: Apache-2.0
// The keys of a clip for the joints of a glTF file.
#pragma once

#include "quarn/play/GltfNodes.h"

namespace quarn {

/// A node in all frames. What does not move has the file's value in every pose, and needs no keys.
struct JointTrack {
    std::size_t node = 0;
    std::vector<NodePose> poses;
    bool isTranslated = false, isRotated = false, isScaled = false;
    bool isAnimated() const { return isTranslated || isRotated || isScaled; }
};

/// Where the joints of a clip are, in the file's own numbers.
class JointTracks {
public:
    /// `joints` nodes, parents before their children; `worlds` [joints][frames] where each one has to be. It gets as
    /// near as its parents and keys without shear allow, each time from where its parent really is.
    JointTracks(const GltfNodes& nodes, const std::vector<std::size_t>& joints,
                const std::vector<std::vector<HMatrix>>& worlds);

    const std::vector<JointTrack>& tracks() const { return tracks_; }
    /// To the world, of all nodes of the file, as a reader has them in that frame.
    std::vector<HMatrix> worlds(std::size_t frame) const;

private:
    JointTrack trackOf(std::size_t joint, const std::vector<HMatrix>& wanted);
    std::vector<HMatrix>& placesOf(std::size_t node, std::size_t frames);

    const GltfNodes& nodes_;
    std::vector<JointTrack> tracks_;
    std::vector<std::vector<HMatrix>> places_; ///< [nodes][frames]: to the world; empty where not yet known
};

} // namespace quarn
