// SPDX-License-Identifier: Apache-2.0
// A panel: meshes of the scene, plain or coloured by their distance from others, and their points at a frame.
#pragma once

#include "openquarn/HPlug.h"
#include "quarn/scene/meshes.h"

#include <span>
#include <string>
#include <vector>

namespace quarn {

struct PanelMesh {
    HPlug mesh;
    HPlug reference; ///< what the distance is to; null where none is shown
};

struct Panel {
    std::string label; ///< empty for none
    std::vector<PanelMesh> meshes;

    /// Shows a distance, of one of its meshes at least; else plain clay.
    bool isHeat() const;
};

/// What a panel shows of a mesh at a frame, in object space.
struct MeshFrame {
    MeshPolygons polygons;
    std::vector<double> points;    ///< x, y, z of each vertex; finite
    std::vector<double> distances; ///< of each vertex from the reference; empty without one
};
/// Of each mesh of a panel.
using PanelFrame = std::vector<MeshFrame>;

/// "LABEL=PLUG+PLUG..." and "LABEL=PLUG:PLUG+PLUG...", where one at least has a reference. Labels may hold a "=": the
/// last one counts. Throws std::runtime_error, quoting the text, when it is none or the plugs do not exist.
/// Thread: main.
Panel panelFrom(const std::string& text);
Panel heatPanelFrom(const std::string& text);

/// Evaluates a panel at the scene's time, which is `frame`. Throws std::runtime_error that names the plug, and the
/// frame, when it fails, has points that no picture can show, or a reference with another number of vertices.
/// Thread: main.
PanelFrame evaluatePanel(const Panel& panel, int frame);

/// Throws for points that are not finite, or so far away that nothing else could be seen; names the plug, the frame and
/// the vertex.
void requireDrawable(std::span<const double> xyz, const std::string& plug, int frame);

} // namespace quarn
