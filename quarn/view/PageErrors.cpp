// SPDX-License-Identifier: Apache-2.0
#include "quarn/view/PageErrors.h"

#include "quarn/scene/Distances.h"

#include <algorithm>
#include <cmath>
#include <numeric>

namespace quarn {

std::vector<float> distancesToTarget(const PageFrames& frames, const std::vector<float>& shape, double mmPerUnit) {
    std::vector<float> distances(shape.size() / 3);
    for (std::size_t i = 0; i < distances.size(); ++i) {
        double squares = 0.0;
        for (std::size_t axis = 0; axis < 3; ++axis) {
            const double along =
                static_cast<double>(shape[3 * i + axis]) - static_cast<double>(frames.target[3 * i + axis]);
            squares += along * along;
        }
        distances[i] = static_cast<float>(std::sqrt(squares) * mmPerUnit);
    }
    return distances;
}

PageErrors pageErrors(const PageFrames& frames, const std::vector<float>& shape, double mmPerUnit) {
    Distances all;
    for (std::size_t frame = 0; frame < frames.count(); ++frame)
        all.add(static_cast<int>(frame), frames.of(shape, frame), frames.of(frames.target, frame));
    PageErrors errors;
    errors.mean = mmPerUnit * all.mean();
    errors.largest = mmPerUnit * all.largest();
    errors.worstFrame = static_cast<std::size_t>(all.worstFrame());
    errors.worstVertex = all.worstVertex();
    errors.usual = mmPerUnit * all.percentile(0.995);
    const std::vector<float> distances = distancesToTarget(frames, shape, mmPerUnit);
    for (std::size_t frame = 0; frame < frames.count(); ++frame) {
        const auto of = frames.of(distances, frame);
        const double sum = std::accumulate(of.begin(), of.end(), 0.0);
        errors.frames.push_back(
            {sum / static_cast<double>(of.size()), static_cast<double>(*std::max_element(of.begin(), of.end()))});
    }
    return errors;
}

} // namespace quarn
