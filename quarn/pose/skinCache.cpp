// SPDX-License-Identifier: Apache-2.0
#include "quarn/pose/skinCache.h"

#include "quarn/scene/plugs.h"
#include "quarn/scene/replacedSkins.h"

#include <stdexcept>

namespace quarn {

HPlug ownSkin(const WarpGeometry& geometry) {
    const HPlug own = skinReplacedBy(geometry.input);
    return own.isNull() ? geometry.input : own;
}

CacheReport connectSkin(const Warp& warp, const WarpGeometry& geometry, const std::string& cacheFile,
                        double startFrame) {
    const HPlug into = warp.plug("input", geometry, "inputGeometry");
    if (into.source().isNull())
        throw std::runtime_error("nothing is connected into " + warp.name + ".input[" + std::to_string(geometry.index) +
                                 "].inputGeometry: there is no skin that a cache could replace");
    const HPlug own = ownSkin(geometry);
    const HPlug rest = geometry.original.source();
    CacheReport report;
    report.replaced = own != geometry.input;
    report.startFrame = startFrame;
    const HObject cache =
        report.replaced ? geometry.input.node() : createNode("pointCache", geometry.name + "_skinCache");
    report.node = nodeName(cache);
    playCache(cache, rest.isNull() ? own : rest, cacheFile, startFrame);
    connectInto(own, plugOf(cache, "replacedMesh"));
    connectInto(plugOf(cache, "outMesh"), into);
    return report;
}

} // namespace quarn
