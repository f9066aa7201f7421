// SPDX-License-Identifier: Apache-2.0
#include "quarn/import/animatedPose.h"

#include "quarn/import/restPose.h"

#include <algorithm>
#include <stdexcept>

namespace quarn {
namespace {

constexpr double mostFrames = 100000.0; // more than an hour: a time of the file is wrong

HVector between(const HVector& from, const HVector& to, double t) {
    return from * (1.0 - t) + to * t;
}

HQuaternion between(const HQuaternion& from, const HQuaternion& to, double t) {
    return HQuaternion::slerp(from, to, t);
}

template <class Value>
Value trackValue(const Track<Value>& track, double seconds) {
    const auto after = std::upper_bound(track.keys.begin(), track.keys.end(), seconds,
                                        [](double time, const Key<Value>& key) { return time < key.seconds; });
    if (after == track.keys.begin())
        return track.keys.front().value;
    const Key<Value>& key = *(after - 1);
    if (after == track.keys.end() || track.interpolation == Interpolation::Step)
        return key.value;
    return between(key.value, after->value, (seconds - key.seconds) / (after->seconds - key.seconds));
}

template <class Value>
void addTimes(const Track<Value>& track, std::vector<double>& times) {
    for (const Key<Value>& key : track.keys)
        times.push_back(key.seconds);
}

} // namespace

HVector valueAt(const Track<HVector>& track, double seconds) {
    return trackValue(track, seconds);
}

HQuaternion valueAt(const Track<HQuaternion>& track, double seconds) {
    return trackValue(track, seconds);
}

AnimatedPose::AnimatedPose(const Character& character, const Animation& animation)
    : character_(character)
    , channels_(character.joints.size(), nullptr)
    , restScales_(character.joints.size())
    , restRotations_(character.joints.size()) {
    const std::vector<JointRest> rests = splitRests(character, &animation);
    for (const JointChannel& channel : animation.channels) {
        channels_[channel.joint] = &channel;
        restScales_[channel.joint] = rests[channel.joint].scale;
        restRotations_[channel.joint] = rests[channel.joint].orient;
    }
}

HMatrix AnimatedPose::local(std::size_t joint, double seconds) const {
    const HMatrix& rest = character_.joints[joint].restTransform;
    const JointChannel* channel = channels_[joint];
    if (channel == nullptr)
        return rest;
    JointRest now{restScales_[joint], restRotations_[joint], rest.row(3), 0.0};
    if (!channel->scale.keys.empty())
        now.scale = valueAt(channel->scale, seconds);
    if (!channel->rotation.keys.empty())
        now.orient = valueAt(channel->rotation, seconds);
    if (!channel->translation.keys.empty())
        now.translate = valueAt(channel->translation, seconds);
    return now.matrix();
}

std::vector<HMatrix> AnimatedPose::worlds(double seconds) const {
    std::vector<HMatrix> world(character_.joints.size());
    for (std::size_t joint = 0; joint < world.size(); ++joint) {
        world[joint] = local(joint, seconds);
        if (const int parent = character_.joints[joint].parent; parent >= 0)
            world[joint] *= world[static_cast<std::size_t>(parent)];
    }
    return world;
}

std::vector<double> sampleTimes(const Animation& animation, double framesPerSecond) {
    if (animation.seconds * framesPerSecond > mostFrames)
        throw std::runtime_error("the animation \"" + animation.name + "\" is more than 100000 frames long");
    std::vector<double> times;
    for (const JointChannel& channel : animation.channels) {
        addTimes(channel.translation, times);
        addTimes(channel.rotation, times);
        addTimes(channel.scale, times);
    }
    for (double frame = 0.0; frame <= animation.seconds * framesPerSecond; frame += 1.0)
        times.push_back(frame / framesPerSecond);
    std::sort(times.begin(), times.end());
    times.erase(std::unique(times.begin(), times.end()), times.end());
    return times;
}

} // namespace quarn
