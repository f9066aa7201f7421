// SPDX-License-Identifier: Apache-2.0
#include "quarn/scene/shownMeshes.h"

#include "quarn/scene/plugs.h"
#include "quarn/scene/replacedSkins.h"

#include "openquarn/HPxGeometryFilter.h"

namespace quarn {
namespace {

constexpr int longestChain = 1000;

// What the deformer that the plug goes into gives out, or the cache that stands in for it; the last one where there are
// several, null without one.
// `serves` is set when something else takes it.
HPlug deformedOf(const HPlug& geometry, bool& serves) {
    HPlugArray destinations;
    geometry.destinations(destinations);
    HPlug deformed;
    for (const HPlug& destination : destinations) {
        if (destination == HPxGeometryFilter::inputGeometry)
            deformed = HPlug(destination.node(), HPxGeometryFilter::outputGeom)
                           .elementByLogicalIndex(destination.parent().logicalIndex());
        else if (const HPlug cached = replacementAt(destination); !cached.isNull())
            deformed = cached;
        else
            serves = true;
    }
    return deformed;
}

// null where the mesh only serves
HPlug endOfChain(const HPlug& mesh) {
    bool serves = false;
    HPlug geometry = deformedOf(mesh, serves);
    if (geometry.isNull())
        return serves ? HPlug() : mesh;
    for (int steps = 0; steps < longestChain; ++steps) {
        const HPlug next = deformedOf(geometry, serves);
        if (next.isNull())
            break;
        geometry = next;
    }
    return geometry;
}

} // namespace

std::vector<HPlug> shownMeshes() {
    std::vector<HPlug> shown;
    for (const char* type : {"mesh", "polyGrid"})
        for (const HObject& node : nodesOfType(type))
            if (const HPlug end = endOfChain(plugOf(node, "outMesh")); !end.isNull())
                shown.push_back(end);
    return shown;
}

} // namespace quarn
