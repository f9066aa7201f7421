// SPDX-License-Identifier: Apache-2.0
#include "quarn/render/drawPanel.h"

#include "quarn/render/shade.h"

namespace quarn {

void drawPanel(Picture& picture, const Layout& layout, int left, const Camera& camera, const Panel& panel,
               const PanelFrame& frame, const HeatScale& scale) {
    Surface surface = makeSurface(frame.polygons, camera.toCamera(frame.points));
    surface.heat.reserve(frame.distances.size());
    for (const double distance : frame.distances)
        surface.heat.push_back(static_cast<float>(distance / scale.range));
    PanelSight sight = gather(surface, camera, layout.width, layout.height);
    smoothLight(sight);
    shade(sight, picture, left);
    if (!panel.label.empty())
        drawLabel(picture, layout, left, panel.label);
    if (panel.isHeat())
        drawColourBar(picture, layout, left, scale.millimetres);
}

} // namespace quarn
