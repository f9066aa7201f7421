// SPDX-License-Identifier: Apache-2.0
#include "quarn/dataset/drawnFrames.h"

#include "quarn/scene/plugs.h"

#include "openquarn/HFnData.h"

#include <algorithm>
#include <cmath>

namespace quarn {
namespace {

// time of the first key, and of the last one that was drawn
std::optional<std::pair<double, double>> drawnTimes(const HObject& curve) {
    if (!plugOf(curve, "output").isSource())
        return {};
    const int count = wholeNumberOf(plugOf(curve, "drawnKeys"));
    const std::vector<double> times = HFnDoubleArrayData(plugOf(curve, "keyTimes").asHObject()).values();
    if (count < 1 || times.empty())
        return {};
    return std::pair(times.front(), times[std::min(times.size(), static_cast<std::size_t>(count)) - 1]);
}

} // namespace

std::optional<FrameRange> drawnFrames(const FrameRange& exported) {
    std::optional<FrameRange> found;
    // the controls of a pose have keys at the same times; where some have been changed since, what all agree on
    for (const HObject& curve : nodesOfType("animCurve"))
        if (const auto times = drawnTimes(curve)) {
            FrameRange drawn = found.value_or(FrameRange{exported.first, exported.last, 1});
            drawn.first = static_cast<int>(std::max<double>(drawn.first, std::ceil(times->first)));
            drawn.last = static_cast<int>(std::min<double>(drawn.last, std::floor(times->second)));
            found = drawn;
        }
    return found && found->first <= found->last ? found : std::nullopt;
}

} // namespace quarn
