// SPDX-License-Identifier: Apache-2.0
#include "quarn/import/animationCurves.h"

#include "quarn/scene/plugs.h"

#include <algorithm>
#include <array>
#include <cmath>
#include <limits>
#include <stdexcept>

namespace quarn {
namespace {

constexpr std::array<const char*, 3> axes = {"X", "Y", "Z"};
// values of files are in single precision: what differs by less does not move
constexpr double rounding = 1e-6;

bool differs(double a, double b) {
    return std::abs(a - b) > rounding * std::max(1.0, std::abs(b));
}

// files have seconds in single precision: what cannot be told from a whole frame is that frame
double frameNear(double seconds, double framesPerSecond) {
    constexpr double hair = 4e-7; // of seconds, by the file and by the importer's milliseconds
    constexpr double most = 0.1;  // frames, however long the animation
    const double frame = frameOf(seconds, framesPerSecond);
    const double whole = std::round(frame);
    return std::abs(frame - whole) <= std::min(most, hair * std::abs(frame)) ? whole : frame;
}

// times of keys in frames, each above the one before: of keys at one time, a jump, the first is a hair earlier, and all
// but the first and the last go
template <class Value>
std::vector<Key<Value>> framesOf(const Track<Value>& track, double framesPerSecond) {
    constexpr double hair = 1e-6;
    std::vector<Key<Value>> keys;
    keys.reserve(track.keys.size());
    for (const Key<Value>& key : track.keys) {
        const double frame = frameNear(key.seconds, framesPerSecond);
        if (!keys.empty() && frame <= keys.back().seconds) {
            const bool hasRoom = keys.size() < 2 || keys[keys.size() - 2].seconds < frame - hair;
            if (hasRoom)
                keys.back().seconds = frame - hair;
            else
                keys.pop_back();
        }
        keys.push_back({frame, key.value});
    }
    return keys;
}

HObject makeCurve(const char* type, const std::string& name, Interpolation interpolation,
                  const std::vector<double>& times, const std::vector<double>& values) {
    HObject curve = createNode(type, name);
    setList(plugOf(curve, "keyTimes"), times);
    setList(plugOf(curve, "keyValues"), values);
    setNumber(plugOf(curve, "interpolation"), interpolation == Interpolation::Step ? 0.0 : 1.0);
    connect(findPlug("time1.outTime"), plugOf(curve, "time"));
    return curve;
}

template <class Value>
std::vector<double> timesOf(const std::vector<Key<Value>>& keys) {
    std::vector<double> times;
    times.reserve(keys.size());
    for (const Key<Value>& key : keys)
        times.push_back(key.seconds);
    return times;
}

std::size_t addVector(const Track<HVector>& track, const HVector& rest, const std::string& attribute,
                      double framesPerSecond, const HObject& joint) {
    const std::vector<Key<HVector>> keys = framesOf(track, framesPerSecond);
    std::size_t made = 0;
    for (unsigned axis = 0; axis < 3; ++axis) {
        const auto moves = [&](const Key<HVector>& key) { return differs(key.value[axis], rest[axis]); };
        if (std::none_of(keys.begin(), keys.end(), moves))
            continue;
        std::vector<double> values;
        values.reserve(keys.size());
        for (const Key<HVector>& key : keys)
            values.push_back(key.value[axis]);
        const std::string plug = attribute + axes.at(axis);
        const HObject curve =
            makeCurve("animCurve", nodeName(joint) + "_" + plug, track.interpolation, timesOf(keys), values);
        connect(plugOf(curve, "output"), plugOf(joint, plug));
        ++made;
    }
    return made;
}

std::size_t addRotation(const Track<HQuaternion>& track, const JointRest& rest, double framesPerSecond,
                        const HObject& joint) {
    const std::vector<Key<HQuaternion>> keys = framesOf(track, framesPerSecond);
    std::vector<double> values;
    values.reserve(4 * keys.size());
    bool moves = false;
    for (const Key<HQuaternion>& key : keys) {
        const HQuaternion turn = rotateOf(key.value, rest);
        moves = moves || std::max({std::abs(turn.x), std::abs(turn.y), std::abs(turn.z)}) > rounding;
        values.insert(values.end(), {turn.x, turn.y, turn.z, turn.w});
    }
    if (!moves)
        return 0;
    const HObject curve =
        makeCurve("animCurveQuaternion", nodeName(joint) + "_rotate", track.interpolation, timesOf(keys), values);
    // each angle by itself, so that another source can take its place
    for (const char* axis : axes)
        connect(plugOf(curve, std::string("outputRotate") + axis), plugOf(joint, std::string("rotate") + axis));
    return 1;
}

std::size_t addWeight(const Track<double>& track, double rest, const std::string& target, double framesPerSecond,
                      const HObject& sliders, std::uint32_t index) {
    const std::vector<Key<double>> keys = framesOf(track, framesPerSecond);
    std::vector<double> values;
    bool moves = false;
    for (const Key<double>& key : keys) {
        moves = moves || differs(key.value, rest);
        values.push_back(key.value);
    }
    if (!moves)
        return 0;
    const HObject curve =
        makeCurve("animCurve", nodeName(sliders) + "_" + target, track.interpolation, timesOf(keys), values);
    const std::string slider = "slider[" + std::to_string(index) + "].";
    connect(plugOf(curve, "output"), plugOf(sliders, slider + "value"));
    // what the file does is in the range
    const auto [least, largest] = std::minmax_element(values.begin(), values.end());
    setNumber(plugOf(sliders, slider + "minValue"), std::min({0.0, rest, *least}));
    setNumber(plugOf(sliders, slider + "maxValue"), std::max({1.0, rest, *largest}));
    return 1;
}

} // namespace

int lastFrameOf(double seconds, double framesPerSecond) {
    const double last = std::floor(frameNear(seconds, framesPerSecond));
    return static_cast<int>(std::clamp(last, 1.0, static_cast<double>(std::numeric_limits<int>::max())));
}

HQuaternion rotateOf(const HQuaternion& rotation, const JointRest& rest) {
    return rotation * rest.orient.conjugate();
}

std::size_t addAnimation(const Character& character, const Animation& animation, const std::vector<JointRest>& rests,
                         double framesPerSecond, const CharacterScene& scene) {
    if (!std::isfinite(frameOf(animation.seconds, framesPerSecond)))
        throw std::runtime_error("the animation \"" + animation.name + "\" has no last frame at this frame rate");
    std::size_t made = 0;
    for (const JointChannel& channel : animation.channels) {
        const HObject& joint = scene.joints[channel.joint];
        const JointRest& rest = rests[channel.joint];
        made += addVector(channel.translation, rest.translate, "translate", framesPerSecond, joint);
        made += addRotation(channel.rotation, rest, framesPerSecond, joint);
        made += addVector(channel.scale, rest.scale, "scale", framesPerSecond, joint);
    }
    for (const MorphChannel& channel : animation.morphs) {
        const MorphTarget& target = character.meshes[channel.mesh].morphTargets[channel.target];
        made += addWeight(channel.weight, target.restWeight, target.name, framesPerSecond,
                          scene.meshes[channel.mesh].morphs.sliders, channel.target);
    }
    return made;
}

} // namespace quarn
