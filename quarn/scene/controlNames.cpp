// SPDX-License-Identifier: Apache-2.0
#include "quarn/scene/controlNames.h"

#include "quarn/scene/Warp.h"
#include "quarn/scene/controlSource.h"
#include "quarn/scene/plugs.h"
#include "quarn/scene/sliders.h"

#include <set>

namespace quarn {
namespace {

// a slider by its own name; else without the compounds on the way, which a plug can be found without: "arm.rotateZ"
std::string nameOf(const HPlug& plug) {
    if (const HPlug slider = sliderBehind(plug); !slider.isNull())
        return sliderName(slider);
    const std::string path = plug.partialName().asChar();
    const bool isPlain = path.find('[') == std::string::npos;
    return nodeName(plug.node()) + "." + (isPlain ? path.substr(path.rfind('.') + 1) : path);
}

std::string nameOf(const ControlSource& source) {
    const std::string name = nameOf(source.plug);
    return source.converter.isNull() ? name : name + ":" + std::to_string(source.number);
}

} // namespace

std::vector<std::string> controlNames(const Warp& warp) {
    const HPlug values = warp.plug("controlValues");
    std::vector<std::string> names;
    std::set<std::string> taken;
    for (const unsigned index : indicesOf(values)) {
        const HPlug value = values.elementByLogicalIndex(index);
        std::string name = nameOf(controlSource(value));
        // the same plug twice: the place tells one from the other
        if (!taken.insert(name).second)
            taken.insert(name += " at " + nameOf(value));
        names.push_back(name);
    }
    return names;
}

} // namespace quarn
