// SPDX-License-Identifier: Apache-2.0
#include "quarn/scene/shownMeshes.h"

#include "quarn/scene/plugs.h"

#include <string>

namespace quarn {
namespace {

constexpr int longestChain = 1000;

// The output of the deformer that deforms what the plug gives out; null where none does. `serves` is set when something
// else takes it.
HPlug deformedOf(const HPlug& geometry, bool& serves) {
    HPlugArray destinations;
    geometry.destinations(destinations);
    HPlug next;
    for (const HPlug& destination : destinations) {
        const std::string name = destination.name().asChar();
        const std::size_t end = name.rfind("].inputGeometry");
        const std::size_t begin = name.rfind("input[");
        if (end == std::string::npos || begin == std::string::npos) {
            serves = true;
            continue;
        }
        const std::string index = name.substr(begin + 6, end - begin - 6);
        next = plugOf(destination.node(), "outputGeom[" + index + "]");
    }
    return next;
}

// null where the mesh only serves
HPlug endOfChain(HPlug geometry) {
    bool serves = false;
    for (int steps = 0; steps < longestChain; ++steps) {
        const HPlug next = deformedOf(geometry, serves);
        if (next.isNull())
            return steps == 0 && serves ? HPlug() : geometry;
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
