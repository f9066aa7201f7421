// SPDX-License-Identifier: Apache-2.0
#include "quarn/pose/keyPoses.h"

#include "quarn/scene/PoseControls.h"
#include "quarn/scene/plugs.h"

#include <algorithm>
#include <cmath>

namespace quarn {
namespace {

std::vector<PoseControl> controlsWithoutKeys(const Warp& warp, const std::vector<PlugKeys>& plugs) {
    if (warp.plug("poseGenerator").source().isNull())
        return {};
    std::vector<PoseControl> controls = poseControls(poseCollector(warp));
    const auto hasKeys = [&](const PoseControl& control) {
        return std::any_of(plugs.begin(), plugs.end(),
                           [&](const PlugKeys& keyed) { return keyed.plug == control.plug; });
    };
    controls.erase(std::remove_if(controls.begin(), controls.end(), hasKeys), controls.end());
    return controls;
}

KeysReport counted(const std::vector<PlugKeys>& plugs) {
    KeysReport report;
    report.plugs = plugs.size();
    double first = plugs.front().keys.times.front();
    double last = first;
    for (const PlugKeys& keyed : plugs) {
        report.keys += keyed.keys.times.size();
        first = std::min(first, keyed.keys.times.front());
        last = std::max(last, keyed.keys.times.back());
    }
    report.firstFrame = static_cast<int>(std::floor(first));
    report.lastFrame = static_cast<int>(std::ceil(last));
    return report;
}

} // namespace

KeysReport keyPoses(const std::optional<Warp>& warp, const std::vector<PlugKeys>& plugs, bool holdOthers) {
    KeysReport report = counted(plugs);
    const std::vector<PoseControl> others =
        warp && holdOthers ? controlsWithoutKeys(*warp, plugs) : std::vector<PoseControl>();
    report.held = others.size();
    removePoseKeys();
    for (const PoseControl& control : others)
        holdAt(control.plug, control.limits.rest);
    for (const PlugKeys& keyed : plugs)
        putPoseKeys(keyed.plug, keyed.keys);
    if (warp) {
        setNumber(warp->plug("exportStartFrame"), report.firstFrame);
        setNumber(warp->plug("exportEndFrame"), report.lastFrame);
    }
    return report;
}

} // namespace quarn
