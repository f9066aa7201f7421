// SPDX-License-Identifier: Apache-2.0
#include "quarn/pose/refinePoses.h"

#include "openquarn_app/Evaluation.h"
#include "quarn/console/Log.h"
#include "quarn/console/StdoutAside.h"
#include "quarn/console/numberText.h"
#include "quarn/pose/ModelEnsemble.h"
#include "quarn/pose/animationPoses.h"
#include "quarn/pose/drawPoses.h"
#include "quarn/pose/farthestPoses.h"
#include "quarn/pose/poseKeys.h"
#include "quarn/pose/rigPoses.h"
#include "quarn/pose/valueAt.h"
#include "quarn/scene/ControlReader.h"
#include "quarn/scene/plugs.h"
#include "quarn/scene/units.h"

#include <algorithm>
#include <iterator>
#include <numeric>
#include <stdexcept>

namespace quarn {
namespace {

FrameRange sampledFrames(const std::vector<PoseControl>& controls) {
    std::vector<HObject> curves;
    for (const PoseControl& control : controls)
        if (const HPlug source = control.plug.source(); !source.isNull() && isSampledCurve(source.node()))
            curves.push_back(source.node());
    if (curves.empty())
        throw std::runtime_error("the scene has no sampled poses that others could be added to: give the one that "
                                 "quarn pose has written, of which the models were trained");
    return extentOf(curves);
}

// as they are, also where two of them are the same
PoseSet posesOf(const std::vector<PoseControl>& controls, const FrameRange& frames) {
    PoseSet poses(limitsOf(controls), 0.0);
    OpenQuarn::EvaluationContext context(frames.first);
    std::vector<double> pose(controls.size());
    for (std::size_t number = 0; number < frames.count(); ++number) {
        const int frame = frames.frame(number);
        context.setTime(frame);
        std::transform(controls.begin(), controls.end(), pose.begin(),
                       [&](const PoseControl& control) { return valueAt(context, control.plug, frame); });
        poses.add(pose);
    }
    return poses;
}

std::span<const double> valuesFrom(const PoseSet& poses, std::size_t first) {
    const std::size_t values = poses.limits().size();
    return {poses.pose(first).data(), (poses.count() - first) * values};
}

double activationRate(const HObject& collector, const RefineOptions& options) {
    const HPlug plug = plugOf(collector, "activationRate");
    const double rate = options.activationRate ? *options.activationRate : numberOf(plug);
    if (!(rate >= 0.0 && rate <= 1.0))
        throw std::runtime_error("the activation rate is " + numberText(rate) + ", not from 0 to 1");
    if (options.activationRate)
        setNumber(plug, rate);
    return rate;
}

// Of each kind so many are added, as of corners alone a network learns little of what lies between: half of them as
// samplePoses() draws, and half with every second active value at one of its limits (decision 0195).
constexpr double limitRates[] = {0.0, 0.5};
constexpr std::size_t kinds = std::size(limitRates);

// how many of a whole are of the kind
std::size_t partOf(std::size_t whole, std::size_t kind) {
    return (whole + kinds - 1 - kind) / kinds;
}

std::size_t candidateCount(const RefineOptions& options) {
    const std::size_t most = std::max(options.candidates, options.count);
    return options.candidates > 0 ? most : std::max<std::size_t>(1000, 20 * options.count);
}

/// Poses that are none of the known ones, nor near one.
class Candidates {
public:
    Candidates(const PoseSet& known, double tolerance, const DrawSettings& settings, const Console& console)
        : poses_(known.limits(), tolerance) {
        for (std::size_t i = 0; i < known.count(); ++i)
            poses_.add(known.pose(i));
        first_ = poses_.count();
        DrawSettings behind = settings;
        behind.count += first_;
        Progress progress(console, "drawing candidates", settings.count);
        drawPoses(poses_, behind, [&](std::size_t steps) { progress.advance(steps); });
    }
    std::size_t count() const { return poses_.count() - first_; }
    std::span<const double> pose(std::size_t number) const { return poses_.pose(first_ + number); }
    std::span<const double> values() const {
        return count() == 0 ? std::span<const double>() : valuesFrom(poses_, first_);
    }

private:
    PoseSet poses_;
    std::size_t first_ = 0;
};

/// What a pose of the rig is worth.
class Asked {
public:
    // takes the poses off the rig
    Asked(const Warp& warp, const std::vector<PoseControl>& controls, ModelEnsemble& models)
        : models_(models)
        , controls_(controls)
        , reader_(warp) {
        removePoseKeys();
        for (const PoseControl& control : controls_)
            holdAt(control.plug, control.limits.rest);
        reader_.read();
        models_.requireControls(reader_.values().size());
    }

    double mm(std::span<const double> pose) {
        for (std::size_t i = 0; i < pose.size(); ++i)
            setNumber(controls_[i].plug, pose[i]);
        reader_.read();
        return 1000.0 * unit_ * models_.disagreement(reader_.values());
    }

private:
    ModelEnsemble& models_;
    const std::vector<PoseControl>& controls_;
    ControlReader reader_;
    double unit_ = metersPerUnit();
};

std::size_t atLimits(std::span<const double> pose, const std::vector<ValueLimits>& limits) {
    std::size_t count = 0;
    for (std::size_t i = 0; i < pose.size(); ++i)
        count += pose[i] == limits[i].least || pose[i] == limits[i].most ? 1U : 0U;
    return count;
}

std::vector<double> worthOf(const Candidates& candidates, Asked& asked, const Console& console) {
    std::vector<double> worth(candidates.count());
    Progress progress(console, "asking the models", std::max<std::size_t>(1, worth.size()));
    for (std::size_t i = 0; i < worth.size(); ++i) {
        worth[i] = asked.mm(candidates.pose(i));
        progress.advance();
    }
    return worth;
}

std::vector<ChosenPose> choose(const PoseSet& known, const Candidates& candidates, const std::vector<double>& worth,
                               std::size_t count, const Console& console) {
    Progress progress(console, "choosing poses", known.count() + std::min(count, worth.size()));
    return farthestPoses(known.limits(), valuesFrom(known, 0), candidates.values(), worth, count,
                         [&] { progress.advance(); });
}

void requireAll(const RefineReport& report, const RefineOptions& options) {
    if (report.added.size() < options.count)
        throw std::runtime_error(std::to_string(report.added.size()) + " poses to add were found, not " +
                                 std::to_string(options.count) + ", that differ by " + numberText(options.tolerance) +
                                 " of the range of a value from those that there are. Raise the activation rate, "
                                 "widen the limits or lower --tolerance");
}

} // namespace

RefineReport refinePoses(const Warp& warp, const RefineOptions& options, const Console& console) {
    Stage stage([&] { return "adding poses for " + warp.name; });
    const StdoutAside aside; // readers of models have their say there
    ModelEnsemble models(options.models);
    const HObject collector = poseCollector(warp);
    const std::vector<PoseControl> controls = poseControls(collector);
    const FrameRange frames = sampledFrames(controls);
    const std::size_t wanted = candidateCount(options);
    requireRoomForPoses(frames.count() + wanted, controls.size());
    const double active = activationRate(collector, options);
    PoseSet poses = posesOf(controls, frames);
    RefineReport report{nodeName(collector), controls.size(), poses.count(), 0, 0.0, {}, frames.first, frames.last};
    const std::size_t drawn = drawnPoses(controls); // those that are added are no motion either
    Asked asked(warp, controls, models);
    for (std::size_t kind = 0; kind < kinds; ++kind) {
        // a seed of their own, or they were the known poses again; and others in the next round
        const std::uint64_t seed = options.seed + 0x9E3779B97F4A7C15U * (kinds * report.known + kind + 1);
        const Candidates candidates(poses, options.tolerance, {partOf(wanted, kind), active, seed, limitRates[kind]},
                                    console);
        const std::vector<double> worth = worthOf(candidates, asked, console);
        report.candidates += candidates.count();
        report.candidatesMm += std::accumulate(worth.begin(), worth.end(), 0.0);
        for (const ChosenPose& chosen : choose(poses, candidates, worth, partOf(options.count, kind), console)) {
            const std::span<const double> pose = candidates.pose(chosen.candidate);
            poses.add(pose);
            report.added.push_back(
                {++report.lastFrame, worth[chosen.candidate], chosen.distance, atLimits(pose, poses.limits())});
        }
    }
    requireAll(report, options);
    report.candidatesMm /= static_cast<double>(report.candidates);
    putSampledPoses(warp, poses, drawn == report.known ? poses.count() : drawn, controls, report.firstFrame, console);
    stage.result([&] { return std::to_string(report.added.size()) + " poses added"; });
    return report;
}

} // namespace quarn
