// SPDX-License-Identifier: Apache-2.0
#include "quarn/pose/rigPoses.h"

#include "quarn/pose/poseKeys.h"
#include "quarn/scene/plugs.h"

#include <algorithm>
#include <numeric>
#include <stdexcept>

namespace quarn {
namespace {

constexpr std::size_t mostNumbers = 100'000'000; // 800 MB

void putKeys(const PoseSet& poses, std::size_t drawn, const std::vector<PoseControl>& controls, int firstFrame) {
    removePoseKeys();
    PoseKeys keys;
    keys.drawn = drawn;
    keys.times.resize(poses.count());
    std::iota(keys.times.begin(), keys.times.end(), static_cast<double>(firstFrame));
    for (std::size_t i = 0; i < controls.size(); ++i) {
        keys.values = poses.track(i);
        putPoseKeys(controls[i].plug, keys);
    }
}

void noteWhatStillMoves(const Console& console) {
    const std::vector<HObject> curves = animationCurves();
    if (!curves.empty())
        console.note(std::to_string(curves.size()) + (curves.size() == 1 ? " curve" : " curves") +
                     " of the scene's animation still drive what is not sampled, " + nodeName(curves.front()) +
                     (curves.size() == 1 ? "" : " among them"));
}

} // namespace

std::vector<ValueLimits> limitsOf(const std::vector<PoseControl>& controls) {
    std::vector<ValueLimits> limits;
    limits.reserve(controls.size());
    for (const PoseControl& control : controls)
        limits.push_back(control.limits);
    return limits;
}

void requireRoomForPoses(std::size_t poses, std::size_t values) {
    if (poses > mostPoses || poses > mostNumbers / values)
        throw std::runtime_error(std::to_string(poses) + " poses of " + std::to_string(values) +
                                 " values are too many: at most " + std::to_string(mostPoses) + " poses and " +
                                 std::to_string(mostNumbers) + " numbers can be made");
}

std::size_t drawnPoses(const std::vector<PoseControl>& controls) {
    for (const PoseControl& control : controls)
        if (const HPlug source = control.plug.source(); !source.isNull() && isSampledCurve(source.node()))
            return static_cast<std::size_t>(std::max(0, wholeNumberOf(plugOf(source.node(), "drawnKeys"))));
    return 0;
}

void putSampledPoses(const Warp& warp, const PoseSet& poses, std::size_t drawn,
                     const std::vector<PoseControl>& controls, int firstFrame, const Console& console) {
    putKeys(poses, drawn, controls, firstFrame);
    setNumber(warp.plug("exportStartFrame"), firstFrame);
    setNumber(warp.plug("exportEndFrame"), firstFrame + static_cast<int>(poses.count()) - 1);
    noteWhatStillMoves(console);
}

} // namespace quarn
