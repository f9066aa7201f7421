// SPDX-License-Identifier: Apache-2.0
#include "quarn/pose/targetCache.h"

#include "quarn/scene/plugs.h"

#include <algorithm>
#include <array>
#include <stdexcept>

namespace quarn {
namespace {

using Targets = std::array<HPlug, 2>;

Targets targetsOf(const Warp& warp, const WarpGeometry& geometry) {
    const std::string index = "[" + std::to_string(geometry.index) + "]";
    return {warp.plug("targetGeometry" + index), warp.plug("targetMorphGeometry" + index)};
}

bool drivesOnly(const HPlug& source, const Targets& targets) {
    HPlugArray driven;
    return !source.destinations(driven).error() && std::all_of(driven.begin(), driven.end(), [&](const HPlug& plug) {
        return std::find(targets.begin(), targets.end(), plug) != targets.end();
    });
}

// the pointCache of an earlier call; null without one
HObject earlierCache(const Targets& targets) {
    for (const HPlug& target : targets)
        if (const HPlug source = target.source();
            !source.isNull() && nodeType(source.node()) == "pointCache" && drivesOnly(source, targets))
            return source.node();
    return {};
}

} // namespace

void connectInto(const HPlug& source, const HPlug& destination) {
    if (destination.source() == source)
        return;
    disconnectSource(destination);
    connect(source, destination);
}

void playCache(const HObject& cache, const HPlug& mesh, const std::string& file, double startFrame) {
    setText(plugOf(cache, "cacheFile"), file);
    setNumber(plugOf(cache, "startFrame"), startFrame);
    connectInto(mesh, plugOf(cache, "inMesh"));
    connectInto(findPlug("time1.outTime"), plugOf(cache, "time"));
}

HPlug restMesh(const WarpGeometry& geometry) {
    const HPlug rest = geometry.original.source();
    return rest.isNull() ? geometry.input : rest;
}

CacheReport connectTarget(const Warp& warp, const WarpGeometry& geometry, const std::string& cacheFile,
                          std::optional<double> startFrame) {
    const Targets targets = targetsOf(warp, geometry);
    CacheReport report;
    report.replaced =
        std::any_of(targets.begin(), targets.end(), [](const HPlug& plug) { return plug.isDestination(); });
    HObject cache = earlierCache(targets);
    if (cache.isNull())
        cache = createNode("pointCache", geometry.name + "_target");
    report.node = nodeName(cache);
    report.startFrame = startFrame ? *startFrame : numberOf(warp.plug("exportStartFrame"));
    playCache(cache, restMesh(geometry), cacheFile, report.startFrame);
    for (const HPlug& target : targets)
        connectInto(plugOf(cache, "outMesh"), target);
    return report;
}

} // namespace quarn
