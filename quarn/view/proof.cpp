// SPDX-License-Identifier: Apache-2.0
#include "quarn/view/proof.h"

#include "quarn/console/interrupt.h"

#include <cmath>
#include <set>

namespace quarn {
namespace {

void compare(std::span<const float> points, std::span<const float> expected, std::size_t frame, Farthest& farthest) {
    for (std::size_t vertex = 0; 3 * vertex < expected.size(); ++vertex) {
        double squares = 0.0;
        for (std::size_t i = 3 * vertex; i < 3 * vertex + 3; ++i) {
            const double along = static_cast<double>(points[i]) - static_cast<double>(expected[i]);
            squares += along * along;
        }
        // a number that is none is farther than any
        if (const double distance = std::sqrt(squares); !(distance <= farthest.distance))
            farthest = {std::isnan(distance) ? HUGE_VAL : distance, frame, vertex};
    }
}

} // namespace

PageProof compareWithScene(viewer::Character& character, ShownBy by, const PageContent& content,
                           const std::function<void()>& step) {
    PageProof proof;
    const PageFrames& frames = content.frames;
    for (std::size_t frame = 0; frame < frames.count(); ++frame) {
        throwIfInterrupted();
        if (by == ShownBy::frame)
            character.showFrame(frame);
        else
            character.showSliders(frame, frames.of(frames.sliders, frame));
        compare(character.points(viewer::Shape::skin), frames.of(frames.input, frame), frame, proof.skin);
        compare(character.points(viewer::Shape::neural), frames.of(frames.output, frame), frame, proof.neural);
        step();
    }
    proof.skin.distance *= content.mmPerUnit;
    proof.neural.distance *= content.mmPerUnit;
    return proof;
}

PageChecks checksOf(viewer::Character& character, std::size_t worst) {
    const std::size_t last = character.frameCount() - 1;
    const std::set<std::size_t> chosen = {0, (last + 1) / 3, worst, (2 * last + 1) / 3, last};
    PageChecks checks;
    for (const std::size_t frame : chosen) {
        character.showFrame(frame);
        checks.frames.push_back(static_cast<std::uint32_t>(frame));
        checks.sums.push_back(character.sum());
    }
    return checks;
}

} // namespace quarn
