// SPDX-License-Identifier: Apache-2.0
#include "quarn/import/posedJoints.h"

#include "quarn/console/numberText.h"
#include "quarn/import/animatedPose.h"
#include "quarn/import/animationCurves.h"

#include <algorithm>
#include <cmath>
#include <stdexcept>

namespace quarn {
namespace {

constexpr double pi = 3.14159265358979323846;
constexpr double defaultRange = pi / 6.0;
constexpr double leastRange = 1e-3; // radians; less is the noise of a recording

std::vector<bool> movingJoints(const Character& character) {
    std::vector<bool> moves(character.joints.size(), false);
    for (const CharacterMesh& mesh : character.meshes) {
        for (const std::vector<Influence>& influences : mesh.influences)
            for (const Influence& influence : influences)
                moves[influence.joint] = true;
        if (mesh.bindings.empty() && mesh.parentJoint >= 0)
            moves[static_cast<std::size_t>(mesh.parentJoint)] = true;
    }
    // children come after their parents
    for (std::size_t joint = moves.size(); joint-- > 0;)
        if (const int parent = character.joints[joint].parent; moves[joint] && parent >= 0)
            moves[static_cast<std::size_t>(parent)] = true;
    return moves;
}

std::vector<bool> placingJoints(const Character& character) {
    std::vector<bool> places(character.joints.size(), false);
    for (const Joint& joint : character.joints)
        if (joint.parent >= 0 && character.joints[static_cast<std::size_t>(joint.parent)].parent < 0)
            places[static_cast<std::size_t>(joint.parent)] = true;
    return places;
}

bool isAny(const JointLimits& limits) {
    return std::any_of(limits.begin(), limits.end(), [](const auto& range) { return range.has_value(); });
}

// the angle that means the same and is nearest to the one before
double unwrapped(double angle, double before) {
    return angle + 2.0 * pi * std::round((before - angle) / (2.0 * pi));
}

// what angles an axis has gone through; 0, the rest pose, is among them
using Ranges = std::array<std::pair<double, double>, 3>;

void widen(Ranges& ranges, const Track<HQuaternion>& rotation, const JointRest& rest,
           const std::vector<double>& times) {
    HVector before;
    for (const double seconds : times) {
        const HEulerRotation angles = rotateOf(valueAt(rotation, seconds), rest).asEulerRotation();
        for (unsigned axis = 0; axis < 3; ++axis) {
            before[axis] = unwrapped(angles[axis], before[axis]);
            ranges.at(axis).first = std::min(ranges.at(axis).first, before[axis]);
            ranges.at(axis).second = std::max(ranges.at(axis).second, before[axis]);
        }
    }
}

JointLimits limitsOf(const Ranges& ranges, double margin) {
    JointLimits limits;
    for (std::size_t axis = 0; axis < ranges.size(); ++axis) {
        const auto& [least, largest] = ranges.at(axis);
        const double more = margin * (largest - least);
        if (largest - least > leastRange)
            limits.at(axis) = {least - more, largest + more};
    }
    return limits;
}

std::vector<JointLimits> animatedLimits(const Character& character, const std::vector<JointRest>& rests,
                                        const PoseChoice& choice) {
    std::vector<Ranges> ranges(character.joints.size(), Ranges{});
    for (const Animation* animation : choice.animations) {
        const std::vector<double> times = sampleTimes(*animation, choice.framesPerSecond);
        for (const JointChannel& channel : animation->channels)
            if (!channel.rotation.keys.empty())
                widen(ranges[channel.joint], channel.rotation, rests[channel.joint], times);
    }
    std::vector<JointLimits> limits;
    limits.reserve(ranges.size());
    for (const Ranges& range : ranges)
        limits.push_back(limitsOf(range, choice.margin));
    return limits;
}

std::string animatedNote(const PoseChoice& choice) {
    const std::string which = choice.animations.size() == 1
                                  ? "the animation \"" + choice.animations.front()->name + "\""
                                  : "all " + std::to_string(choice.animations.size()) + " animations";
    const std::string more =
        choice.margin > 0.0 ? ", and " + numberText(choice.margin) + " of it more on both sides" : "";
    return "limits of the poses: the range of " + which + more;
}

std::vector<JointLimits> limitsOf(const Character& character, const std::vector<JointRest>& rests,
                                  const PoseChoice& choice, std::vector<std::string>& notes) {
    std::vector<JointLimits> limits(character.joints.size());
    if (choice.limits != nullptr) {
        for (const auto& [name, ranges] : *choice.limits)
            limits[jointNamed(character, name)] = ranges;
        return limits;
    }
    limits = animatedLimits(character, rests, choice);
    if (choice.hasOthers || std::any_of(limits.begin(), limits.end(), isAny)) {
        notes.push_back(animatedNote(choice));
        return limits;
    }
    if (!limits.empty())
        notes.emplace_back("limits of the poses: 30 degrees to both sides of every axis");
    JointLimits both;
    both.fill(std::pair(-defaultRange, defaultRange));
    limits.assign(limits.size(), both);
    return limits;
}

bool isSingular(const JointRest& rest) {
    HStatus status;
    rest.matrix().inverse(&status);
    return status.error();
}

// what the user reads of the joints that are left out for one reason
class LeftOut {
public:
    explicit LeftOut(std::string reason)
        : reason_(std::move(reason)) {}
    void add(const std::string& joint) { names_ += (names_.empty() ? "" : ", ") + joint; }
    void tell(std::vector<std::string>& notes) const {
        if (!names_.empty())
            notes.push_back("no controls of joints " + reason_ + ": " + names_);
    }

private:
    std::string reason_;
    std::string names_;
};

} // namespace

PosedJoints choosePosedJoints(const Character& character, const std::vector<JointRest>& rests,
                              const PoseChoice& choice) {
    PosedJoints posed;
    const std::vector<JointLimits> limits = limitsOf(character, rests, choice, posed.notes);
    const std::vector<bool> moves = movingJoints(character);
    const std::vector<bool> places = placingJoints(character);
    LeftOut still("that move no vertex");
    LeftOut roots("that place the character (--with-roots keeps them)");
    LeftOut unturned(choice.limits != nullptr ? "without limits" : "that the animation does not turn");
    LeftOut flat("with a scale of 0 at rest");
    for (std::size_t joint = 0; joint < limits.size(); ++joint) {
        const std::string& name = character.joints[joint].name;
        const bool isAsked = choice.withRoots || (choice.limits != nullptr && choice.limits->count(name) > 0);
        if (!moves[joint])
            still.add(name);
        else if (places[joint] && !isAsked)
            roots.add(name);
        else if (!isAny(limits[joint]))
            unturned.add(name);
        else if (isSingular(rests[joint]))
            flat.add(name);
        else
            posed.joints.push_back({joint, limits[joint]});
    }
    for (const LeftOut* reason : {&still, &roots, &unturned, &flat})
        reason->tell(posed.notes);
    return posed;
}

} // namespace quarn
