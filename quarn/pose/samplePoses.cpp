// SPDX-License-Identifier: Apache-2.0
#include "quarn/pose/samplePoses.h"

#include "quarn/console/Log.h"
#include "quarn/console/numberText.h"
#include "quarn/pose/animationPoses.h"
#include "quarn/pose/drawPoses.h"
#include "quarn/pose/poseKeys.h"
#include "quarn/pose/rigPoses.h"
#include "quarn/scene/plugs.h"

#include <stdexcept>

namespace quarn {
namespace {

constexpr int largestFrame = 100'000'000;

DrawSettings drawSettings(const HObject& collector, const SampleOptions& options) {
    const HPlug samples = plugOf(collector, "samples");
    const HPlug rate = plugOf(collector, "activationRate");
    const int count = options.samples ? *options.samples : wholeNumberOf(samples);
    const double likely = options.activationRate ? *options.activationRate : numberOf(rate);
    if (count < 1 || static_cast<std::size_t>(count) > mostPoses)
        throw std::runtime_error("the number of samples is " + std::to_string(count) + ": 1 to " +
                                 std::to_string(mostPoses) + " poses can be drawn");
    if (!(likely >= 0.0 && likely <= 1.0))
        throw std::runtime_error("the activation rate is " + numberText(likely) + ", not from 0 to 1");
    if (options.samples)
        setNumber(samples, count);
    if (options.activationRate)
        setNumber(rate, likely);
    if (!(options.limitRate >= 0.0 && options.limitRate <= 1.0))
        throw std::runtime_error("the limit rate is " + numberText(options.limitRate) + ", not from 0 to 1");
    return {static_cast<std::size_t>(count), likely, options.seed, options.limitRate};
}

int firstFrame(const HObject& collector, const SampleOptions& options) {
    const HPlug start = plugOf(collector, "samplesStartFrame");
    const int frame = options.start ? *options.start : wholeNumberOf(start);
    if (frame > largestFrame || frame < -largestFrame)
        throw std::runtime_error("the first frame is " + std::to_string(frame) + ", more than " +
                                 std::to_string(largestFrame) + " from frame 0");
    if (options.start)
        setNumber(start, frame);
    return frame;
}

void addDefaultPose(PoseSet& poses) {
    std::vector<double> rest;
    rest.reserve(poses.limits().size());
    for (const ValueLimits& limits : poses.limits())
        rest.push_back(limits.rest);
    poses.add(rest);
}

void draw(PoseSet& poses, const HObject& collector, const SampleOptions& options, const Console& console,
          SampleReport& report) {
    const DrawSettings settings = drawSettings(collector, options);
    requireRoomForPoses(settings.count, poses.limits().size());
    Progress progress(console, "drawing poses", settings.count);
    progress.advance(poses.count());
    report.drawnAgain = drawPoses(poses, settings, [&](std::size_t steps) { progress.advance(steps); });
    if (poses.count() < settings.count)
        report.asked = settings.count;
}

void takeFromAnimation(PoseSet& poses, const std::vector<PoseControl>& controls, const SampleOptions& options,
                       const Console& console, SampleReport& report) {
    requireOwnAnimation(controls);
    const FrameRange frames = options.frames.empty() ? extentOf(animationCurves()) : frameRange(options.frames);
    requireRoomForPoses(poses.count() + frames.count(), controls.size());
    Progress progress(console, "taking poses from the animation", frames.count());
    const AnimationPoses taken =
        addAnimationPoses(poses, controls, frames, [&](std::size_t steps) { progress.advance(steps); });
    report.framesLeftOut = taken.dropped;
    if (taken.outside > 0)
        console.warn(std::to_string(taken.outside) + " frames of the animation go beyond the limits, the first with " +
                     taken.firstOutside + "; their poses are taken as they are");
}

void warnOfFew(const Console& console, const SampleReport& report, const SampleOptions& options) {
    if (report.asked)
        console.warn(std::to_string(report.fromLimits) + " poses were found, not " + std::to_string(*report.asked) +
                     ": " + std::to_string(drawsInVain) + " draws in a row gave poses that differ by less than " +
                     numberText(options.tolerance) + " of the range of each value from one that there is. Raise " +
                     "the activation rate, widen the limits or lower --tolerance");
}

void warnOfDefaults(const Console& console, const std::vector<PoseControl>& controls) {
    for (const PoseControl& control : controls)
        if (control.limits.rest < control.limits.least || control.limits.rest > control.limits.most)
            console.warn("the default of " + control.input + " lies outside of its limits");
}

} // namespace

SampleReport samplePoses(const Warp& warp, const SampleOptions& options, const Console& console) {
    Stage stage([&] { return "sampling poses for " + warp.name; });
    const HObject collector = poseCollector(warp);
    const std::vector<PoseControl> controls = poseControls(collector);
    warnOfDefaults(console, controls);
    PoseSet poses(limitsOf(controls), options.tolerance);
    SampleReport report;
    report.collector = nodeName(collector);
    report.values = controls.size();
    report.firstFrame = firstFrame(collector, options);
    addDefaultPose(poses);
    if (options.fromLimits)
        draw(poses, collector, options, console, report);
    report.fromLimits = poses.count();
    warnOfFew(console, report, options);
    if (options.fromAnimation)
        takeFromAnimation(poses, controls, options, console, report);
    report.poses = poses.count();
    report.fromAnimation = report.poses - report.fromLimits;
    report.lastFrame = report.firstFrame + static_cast<int>(report.poses) - 1;
    // keys go on only when all is known, so that an error changes nothing
    const std::size_t drawn = options.fromLimits ? report.fromLimits : 0;
    putSampledPoses(warp, poses, drawn, controls, report.firstFrame, console);
    stage.result(
        [&] { return std::to_string(report.poses) + " poses of " + std::to_string(report.values) + " values"; });
    return report;
}

} // namespace quarn
