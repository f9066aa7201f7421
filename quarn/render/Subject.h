// SPDX-License-Identifier: Apache-2.0
// What the camera is there for: all that the panels show, or the part of it that moves or differs.
#pragma once

#include "quarn/render/Framing.h"
#include "quarn/render/Panel.h"

#include <map>
#include <string>
#include <utility>
#include <vector>

namespace quarn {

enum class FrameOn {
    all,
    moving,   ///< from frame to frame
    differing ///< from panel to panel, or from what the distance is to
};

/// "all", "moving" or "differing"; throws UsageError, quoting the text, for anything else.
FrameOn frameOnFrom(const std::string& text);

/// Collects frames; then knows the camera. Of each vertex it keeps how far it reaches, and no positions, so that the
/// memory does not grow with the frames. Vertices without a polygon that can be seen do not count.
class Subject {
public:
    Subject(FrameOn what, const Framing& framing);

    /// All panels at one frame. Meshes of several panels are taken for the same one, and compared, when they stand at
    /// the same place in their panels and have the same number of vertices.
    void include(const std::vector<PanelFrame>& panels);

    /// The camera that sees every vertex that counts, in all frames: of what moves, or differs, those that do so by
    /// more than a tenth of the one that does so most.
    Camera camera() const;
    /// Whether there is anything of the kind; where not, the camera sees all.
    bool isFound() const;

private:
    struct Vertex {
        Framing::Reach reach;
        HVector lowest, highest; ///< in the first panel that shows it
        double difference = 0.0; ///< the largest of all frames
        bool isSeen = false;     ///< a corner of a polygon
    };
    using Mesh = std::vector<Vertex>;

    void include(const MeshFrame& frame, Mesh& mesh, const MeshFrame& first) const;
    double amount(const Vertex& vertex) const;
    double largest() const;

    FrameOn what_;
    Framing framing_;
    std::map<std::pair<std::size_t, std::size_t>, Mesh> meshes_; ///< by place in the panel and number of vertices
};

} // namespace quarn
