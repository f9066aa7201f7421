// SPDX-License-Identifier: Apache-2.0
#include "quarn/pose/cacheTimes.h"

#include "quarn/console/numberText.h"

#include <cmath>

namespace quarn {
namespace {

// of a frame; single precision is as fine as that up to nine minutes after the beginning
constexpr double agrees = 1e-3;

std::string frameNote(double first, double startFrame) {
    return "the cache says that it begins at frame " + numberText(first) + ", and is played from frame " +
           numberText(startFrame) + " on: --start-frame " + numberText(first) + " takes it at its word";
}

std::string stepNote(double step) {
    return "the cache says that it has a sample every " + numberText(step) +
           " frames, and each is played as one frame of the scene";
}

/// The frame that does not follow the one before after `step` seconds; none where all do.
std::optional<std::size_t> unevenFrame(const storage::PointCache& cache, double step) {
    double before = *cache.secondsOf(0);
    for (std::size_t frame = 1; frame < cache.frameCount(); ++frame) {
        const double seconds = *cache.secondsOf(frame);
        // what a single number rounds away grows with the time
        if (std::abs(seconds - before - step) > agrees * std::abs(step) + 1e-6 * std::abs(seconds))
            return frame;
        before = seconds;
    }
    return std::nullopt;
}

void addSecondsNotes(const storage::PointCache& cache, double startFrame, double rate,
                     std::vector<std::string>& notes) {
    const double first = *cache.secondsOf(0);
    const std::size_t last = cache.frameCount() - 1;
    const double step = last == 0 ? 1.0 / rate : (*cache.secondsOf(last) - first) / static_cast<double>(last);
    if (step <= 0.0) {
        notes.push_back("the times of the cache do not rise: frame 0 is at " + numberText(first) + " s and frame " +
                        std::to_string(last) + " at " + numberText(*cache.secondsOf(last)) +
                        " s; each is played as one frame of the scene");
        return;
    }
    if (std::abs(step * rate - 1.0) > agrees)
        notes.push_back("the times of the cache have " + numberText(1.0 / step) +
                        " frames a second, and the scene has " + numberText(rate) +
                        ": each is played as one frame of the scene");
    if (const auto frame = unevenFrame(cache, step))
        notes.push_back("the frames of the cache are not evenly spaced: its frame " + std::to_string(*frame) + " is " +
                        numberText(*cache.secondsOf(*frame) - *cache.secondsOf(*frame - 1)) +
                        " s after the one before, and " + numberText(step) +
                        " s are the mean; each is played as one frame of the scene");
    if (first != 0.0 && std::abs(first * rate - startFrame) > agrees)
        notes.push_back(frameNote(first * rate, startFrame));
}

} // namespace

std::vector<std::string> cacheTimesNotes(const storage::PointCache& cache, double startFrame,
                                         std::optional<double> framesPerSecond) {
    std::vector<std::string> notes;
    if (cache.frameCount() == 0)
        return notes;
    if (cache.frameStep() && *cache.frameStep() != 1.0 && cache.frameCount() > 1)
        notes.push_back(stepNote(*cache.frameStep()));
    if (cache.firstFrame() && *cache.firstFrame() != startFrame)
        notes.push_back(frameNote(*cache.firstFrame(), startFrame));
    if (framesPerSecond && cache.secondsOf(0))
        addSecondsNotes(cache, startFrame, *framesPerSecond, notes);
    return notes;
}

} // namespace quarn
