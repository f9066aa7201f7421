// SPDX-License-Identifier: Apache-2.0
#include "quarn/play/MorphClip.h"

#include <algorithm>
#include <functional>

namespace quarn {
namespace {

void subtract(std::vector<float>& numbers, const std::vector<float>& from) {
    std::transform(numbers.begin(), numbers.end(), from.begin(), numbers.begin(), std::minus<>());
}

} // namespace

MorphClip clipOfFrames(std::vector<ClipShape> frames, const std::vector<int>& numbers) {
    MorphClip clip{std::move(frames.front()), {}, std::vector<float>(frames.size() * (frames.size() - 1))};
    const std::size_t targetCount = frames.size() - 1;
    for (std::size_t frame = 1; frame < frames.size(); ++frame) {
        ClipTarget target{"frame " + std::to_string(numbers[frame]), std::move(frames[frame])};
        subtract(target.shape.points, clip.base.points);
        subtract(target.shape.normals, clip.base.normals);
        clip.targets.push_back(std::move(target));
        clip.weights[frame * targetCount + frame - 1] = 1.0F;
    }
    return clip;
}

} // namespace quarn
