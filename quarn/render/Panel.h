// SPDX-License-Identifier: Apache-2.0
// A panel: a mesh of the scene, plain or coloured by its distance from another, and its points at a frame.
#pragma once

#include "openquarn/HPlug.h"
#include "quarn/scene/meshes.h"

#include <span>
#include <string>
#include <vector>

namespace quarn {

struct Panel {
    std::string label; ///< empty for none
    HPlug mesh;
    HPlug reference; ///< what the distance is to; null for plain clay

    bool isHeat() const { return !reference.isNull(); }
};

/// What a panel shows at a frame, in object space.
struct PanelFrame {
    MeshPolygons polygons;
    std::vector<double> points;    ///< x, y, z of each vertex; finite
    std::vector<double> distances; ///< of each vertex from the reference; empty for plain clay
};

/// "LABEL=PLUG" and "LABEL=PLUG:PLUG". Labels may hold a "=": the last one counts. Throws std::runtime_error, quoting
/// the text, when it is none or the plugs do not exist. Thread: main.
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
