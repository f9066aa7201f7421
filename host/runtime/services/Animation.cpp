// SPDX-License-Identifier: Apache-2.0
#include "openquarn_app/Animation.h"

#include "core/Operations.h"
#include "openquarn/HAnimControl.h"
#include "openquarn/HDGContext.h"
#include "services/AnimationState.h"

#include <cmath>
#include <stdexcept>
#include <string>

namespace OpenQuarn {

AnimationState& animationState() noexcept {
    static AnimationState state;
    return state;
}

void Animation::setPlaying(bool isPlaying) noexcept {
    animationState().isPlaying = isPlaying;
}

void Animation::setScrubbing(bool isScrubbing) noexcept {
    animationState().isScrubbing = isScrubbing;
}

void Animation::setFramesPerSecond(double framesPerSecond) {
    if (!std::isfinite(framesPerSecond) || framesPerSecond <= 0.0)
        throw std::invalid_argument("frames per second must be finite and above 0, not " +
                                    std::to_string(framesPerSecond));
    animationState().framesPerSecond = framesPerSecond;
}

void Animation::setRange(double startFrame, double endFrame) {
    if (!std::isfinite(startFrame) || !std::isfinite(endFrame) || startFrame > endFrame)
        throw std::invalid_argument("an animation cannot go from frame " + std::to_string(startFrame) + " to " +
                                    std::to_string(endFrame));
    animationState().startFrame = startFrame;
    animationState().endFrame = endFrame;
}

} // namespace OpenQuarn

using OpenQuarn::animationState;
using OpenQuarn::isRefused;
using OpenQuarn::Operation;

bool HAnimControl::isPlaying() noexcept {
    return animationState().isPlaying;
}

bool HAnimControl::isScrubbing() noexcept {
    return animationState().isScrubbing;
}

HTime HAnimControl::currentTime() noexcept {
    return isRefused(Operation::HAnimControl_currentTime) ? HTime() : HTime(HDGContext().time());
}

HTime HAnimControl::animationStartTime() noexcept {
    return HTime(animationState().startFrame);
}

HTime HAnimControl::animationEndTime() noexcept {
    return HTime(animationState().endFrame);
}

double HTime::seconds() const noexcept {
    return frames_ / framesPerSecond();
}

HTime HTime::fromSeconds(double seconds) noexcept {
    return HTime(seconds * framesPerSecond());
}

double HTime::framesPerSecond() noexcept {
    return animationState().framesPerSecond;
}
