// SPDX-License-Identifier: Apache-2.0
#include "quarn/render/drawPanel.h"

#include "quarn/render/shade.h"

#include <algorithm>

namespace quarn {

namespace {

void addHeat(Surface& surface, const MeshFrame& mesh, double range) {
    if (mesh.distances.empty())
        surface.heat.resize(surface.points.size(), unmeasured);
    for (const double distance : mesh.distances)
        surface.heat.push_back(static_cast<float>(distance / range));
}

} // namespace

void drawPanel(Picture& picture, const Layout& layout, int left, const Camera& camera, const Panel& panel,
               const PanelFrame& frame, const HeatScale& scale) {
    const bool isHeat =
        std::any_of(frame.begin(), frame.end(), [](const MeshFrame& mesh) { return !mesh.distances.empty(); });
    Surface surface;
    for (const MeshFrame& mesh : frame) {
        addMesh(surface, mesh.polygons, mesh.points, camera);
        if (isHeat)
            addHeat(surface, mesh, scale.range);
    }
    PanelSight sight = gather(surface, camera, layout.width, layout.height);
    if (isHeat) {
        shadeFlat(sight, picture, left);
    } else {
        smoothLight(sight);
        shade(sight, picture, left);
    }
    if (!panel.label.empty())
        drawLabel(picture, layout, left, panel.label);
    if (panel.isHeat())
        drawColourBar(picture, layout, left, scale.millimetres);
}

} // namespace quarn
