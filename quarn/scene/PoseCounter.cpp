// SPDX-License-Identifier: Apache-2.0
#include "quarn/scene/PoseCounter.h"

#include <algorithm>
#include <cmath>
#include <utility>

namespace quarn {

PoseCounter::PoseCounter(neuralWarp::ModelCertificate certificate, neuralWarp::TrainedPoses poses)
    : certificate_(std::move(certificate))
    , poses_(std::move(poses)) {}

void PoseCounter::add(int frame, std::span<const float> controls) {
    const neuralWarp::ControlRanges& ranges = certificate_.ranges;
    if (controls.size() < ranges.count())
        return;
    ++counts_.frames;
    const double distance = ranges.distance(controls);
    if (distance > 0.0) {
        ++counts_.outside;
        counts_.distance = std::max(counts_.distance, distance);
        look(frame, controls);
    }
    if (poses_.isEmpty() || certificate_.expected.isEmpty())
        return;
    const double far = poses_.distance(controls);
    errors_.push_back({frame, certificate_.expected.at(far, distance)});
    if (distance > 0.0 || far > certificate_.expected.measuredTo())
        ++beyond_;
}

// which controls they are
void PoseCounter::look(int frame, std::span<const float> controls) {
    const neuralWarp::ControlRanges& ranges = certificate_.ranges;
    for (std::size_t i = 0; i < ranges.count(); ++i) {
        const double excess = ranges.excess(i, controls[i]);
        if (excess == 0.0)
            continue;
        OutsideControl& control = outside_[i];
        ++control.frames;
        if (std::abs(excess) <= std::abs(control.excess))
            continue;
        control.excess = excess;
        control.frame = frame;
    }
}

PoseCounts PoseCounter::counts() const {
    const neuralWarp::ControlRanges& ranges = certificate_.ranges;
    PoseCounts counts = counts_;
    std::vector<std::pair<double, OutsideControl>> sorted;
    for (const auto& [index, found] : outside_) {
        OutsideControl control = found;
        control.name = certificate_.controlNames[index];
        const double width = double{ranges.maximum(index)} - double{ranges.minimum(index)};
        if (width > 0.0)
            control.part = std::abs(control.excess) / width;
        sorted.emplace_back(std::abs(control.excess) / ranges.unit(index), std::move(control));
    }
    std::stable_sort(sorted.begin(), sorted.end(), [](const auto& a, const auto& b) { return a.first > b.first; });
    for (auto& [distance, control] : sorted)
        counts.controls.push_back(std::move(control));
    if (errors_.empty())
        return counts;
    ExpectedErrors& expected = counts.expected.emplace();
    expected.beyond = beyond_;
    for (const FrameError& error : errors_)
        expected.mean += error.millimetres / static_cast<double>(errors_.size());
    constexpr std::size_t mostWorst = 5;
    expected.worst.resize(std::min(mostWorst, errors_.size()));
    std::partial_sort_copy(errors_.begin(), errors_.end(), expected.worst.begin(), expected.worst.end(),
                           [](const FrameError& a, const FrameError& b) {
                               return a.millimetres != b.millimetres ? a.millimetres > b.millimetres
                                                                     : a.frame < b.frame;
                           });
    return counts;
}

} // namespace quarn
