// SPDX-License-Identifier: Apache-2.0
#include "quarn/pose/animationPoses.h"

#include "openquarn/HFnData.h"
#include "openquarn_app/Evaluation.h"
#include "quarn/pose/poseKeys.h"
#include "quarn/pose/valueAt.h"
#include "quarn/scene/plugs.h"

#include <algorithm>
#include <cmath>
#include <limits>
#include <stdexcept>

namespace quarn {
namespace {

constexpr double largestFrame = 1e8;

// a key may miss its frame by a hair, having been seconds
constexpr double hair = 1e-6;

bool isOutside(double value, const ValueLimits& limits) {
    const double slack = 1e-9 * (limits.most - limits.least);
    return value < limits.least - slack || value > limits.most + slack;
}

} // namespace

void requireOwnAnimation(const std::vector<PoseControl>& controls) {
    for (const PoseControl& control : controls)
        if (const HPlug source = control.plug.source(); !source.isNull() && isSampledCurve(source.node()))
            throw std::runtime_error(writtenName(control.plug) +
                                     " has the poses of an earlier quarn pose, which took the animation off; sample "
                                     "the animation from the scene before that");
}

FrameRange extentOf(const std::vector<HObject>& curves) {
    double first = std::numeric_limits<double>::infinity();
    double last = -first;
    for (const HObject& curve : curves) {
        const std::vector<double> times = HFnDoubleArrayData(plugOf(curve, "keyTimes").asHObject()).values();
        if (times.empty())
            continue;
        first = std::min(first, times.front());
        last = std::max(last, times.back());
    }
    if (first > last)
        throw std::runtime_error("the scene has no animation to take poses from: no animation curve drives anything; "
                                 "--frames A-B takes frames of a scene that moves by other means");
    if (!(first >= -largestFrame && last <= largestFrame))
        throw std::runtime_error("the keys of the scene's animation lie beyond frame 100000000; choose a part of them "
                                 "with --frames A-B");
    const int begin = static_cast<int>(std::ceil(first - hair));
    return {begin, std::max(begin, static_cast<int>(std::floor(last + hair))), 1};
}

AnimationPoses addAnimationPoses(PoseSet& poses, const std::vector<PoseControl>& controls, const FrameRange& frames,
                                 const std::function<void(std::size_t)>& step) {
    AnimationPoses result;
    OpenQuarn::EvaluationContext context(frames.first);
    std::vector<double> pose(controls.size());
    for (std::size_t number = 0; number < frames.count(); ++number) {
        context.setTime(frames.frame(number));
        bool outside = false;
        for (std::size_t i = 0; i < controls.size(); ++i) {
            pose[i] = valueAt(context, controls[i].plug, frames.frame(number));
            outside = outside || isOutside(pose[i], controls[i].limits);
            if (outside && result.firstOutside.empty())
                result.firstOutside = controlName(controls[i].plug);
        }
        result.outside += outside ? 1U : 0U;
        result.dropped += poses.add(pose) ? 0U : 1U;
        step(1);
    }
    return result;
}

} // namespace quarn
