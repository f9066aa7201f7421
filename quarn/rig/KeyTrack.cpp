// SPDX-License-Identifier: Apache-2.0
// The interpolations of glTF 2.0: Khronos Group, "glTF 2.0 Specification", appendix C, "Animation Sampler Interpolation
// Modes" (decision 0067).
#include "rig/KeyTrack.h"

#include "rig/texts.h"

#include <algorithm>
#include <cmath>

namespace rig {
namespace {

HStatus checkList(const char* name, const std::vector<double>& values, std::size_t expected, std::size_t keys) {
    if (values.size() != expected)
        return {HStatus::kFailure, std::string(name) + " has " + std::to_string(values.size()) + " values; " +
                                       std::to_string(keys) + " keyTimes need " + std::to_string(expected)};
    for (std::size_t i = 0; i < values.size(); ++i)
        if (!std::isfinite(values[i]))
            return {HStatus::kFailure, element(name, i) + " is " + text(values[i])};
    return HStatus::kSuccess;
}

HStatus checkAscending(const std::vector<double>& times) {
    for (std::size_t i = 1; i < times.size(); ++i)
        if (times[i] <= times[i - 1])
            return {HStatus::kFailure, element("keyTimes", i) + " is " + text(times[i]) + ", not above " +
                                           element("keyTimes", i - 1) + ", which is " + text(times[i - 1])};
    return HStatus::kSuccess;
}

} // namespace

HStatus interpolationOf(int number, Interpolation& interpolation) {
    if (number < 0 || number > static_cast<int>(Interpolation::spline))
        return {HStatus::kFailure, "interpolation is " + std::to_string(number) + ", which stands for none (0 to 2)"};
    interpolation = static_cast<Interpolation>(number);
    return HStatus::kSuccess;
}

HStatus KeyTrack::update(const KeyHandles& handles, Interpolation interpolation) {
    // each of them: no short cut
    const bool times = times_.update(handles.times);
    const bool values = values_.update(handles.values);
    const bool inTangents = inTangents_.update(handles.inTangents);
    const bool outTangents = outTangents_.update(handles.outTangents);
    if (times || values || inTangents || outTangents || interpolation != checkedFor_)
        isCurrent_ = false;
    if (!isCurrent_) {
        status_ = check(interpolation);
        checkedFor_ = interpolation;
        isCurrent_ = true;
    }
    return status_;
}

HStatus KeyTrack::check(Interpolation interpolation) const {
    const std::size_t keys = keyCount();
    HStatus status = checkList("keyTimes", times_.values(), keys, keys);
    if (!status.error())
        status = checkAscending(times_.values());
    if (!status.error())
        status = checkList("keyValues", values_.values(), keys * components_, keys);
    if (status.error() || interpolation != Interpolation::spline)
        return status;
    status = checkList("keyInTangents", inTangents_.values(), keys * components_, keys);
    return status.error() ? status : checkList("keyOutTangents", outTangents_.values(), keys * components_, keys);
}

KeyPlace KeyTrack::find(double time) const {
    const std::vector<double>& times = times_.values();
    const auto next = std::upper_bound(times.begin(), times.end(), time);
    if (next == times.begin())
        return {};
    const auto before = static_cast<std::size_t>(next - times.begin()) - 1;
    if (next == times.end())
        return {before, before, 0.0, 0.0};
    const double duration = *next - times[before];
    return {before, before + 1, (time - times[before]) / duration, duration};
}

double KeyTrack::sample(const KeyPlace& place, Interpolation interpolation, std::size_t component) const {
    const double from = value(place.before)[component];
    if (interpolation == Interpolation::step || place.after == place.before)
        return from;
    if (interpolation == Interpolation::spline)
        return hermite(place, component);
    return (1.0 - place.fraction) * from + place.fraction * value(place.after)[component];
}

double KeyTrack::hermite(const KeyPlace& place, std::size_t component) const {
    const double s = place.fraction;
    const double s2 = s * s;
    const double s3 = s2 * s;
    const double out = place.duration * part(outTangents_, place.before)[component];
    const double in = place.duration * part(inTangents_, place.after)[component];
    return (2.0 * s3 - 3.0 * s2 + 1.0) * value(place.before)[component] + (s3 - 2.0 * s2 + s) * out +
           (-2.0 * s3 + 3.0 * s2) * value(place.after)[component] + (s3 - s2) * in;
}

} // namespace rig
