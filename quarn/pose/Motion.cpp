// SPDX-License-Identifier: Apache-2.0
#include "quarn/pose/Motion.h"

#include "openquarn/HFnDependencyNode.h"
#include "openquarn/HTransformationMatrix.h"
#include "quarn/pose/poseKeys.h"
#include "quarn/pose/valueAt.h"
#include "quarn/scene/plugs.h"

#include <algorithm>
#include <set>
#include <stdexcept>

namespace quarn {
namespace {

constexpr std::size_t mostNumbers = 100'000'000; // 800 MB
constexpr std::array<const char*, 4> channels = {"translate", "rotate", "jointOrient", "scale"};
constexpr std::array<const char*, 3> axes = {"X", "Y", "Z"};

bool isDriven(const HPlug& plug) {
    for (HPlug place = plug; !place.isNull(); place = wholeOf(place))
        if (place.isDestination())
            return true;
    return false;
}

// the plugs of a motion, each once, in the order of adding
class PlugList {
public:
    void add(const HPlug& plug) {
        if (plug.isCompound()) {
            for (unsigned child = 0; child < plug.numChildren(); ++child)
                add(plug.child(child));
            return;
        }
        if (plug.isArray() || !plug.attribute().hasFn(HFn::kNumericAttribute))
            return;
        std::string name = controlName(plug);
        if (names_.insert(name).second)
            tracks_.push_back({plug, std::move(name), {}, whyNotKeyable(plug).empty()});
    }
    std::vector<PlugTrack> take() { return std::move(tracks_); }

private:
    std::set<std::string> names_;
    std::vector<PlugTrack> tracks_;
};

// where one axis is driven the others may be elsewhere than in the scene that the keys go to
void addJoint(const SceneJoint& joint, PlugList& plugs) {
    for (const char* channel : channels) {
        const HPlug whole = plugOf(joint.node, channel);
        bool any = false;
        for (unsigned axis = 0; axis < 3; ++axis)
            any = any || isDriven(whole.child(axis));
        if (any)
            plugs.add(whole);
    }
}

void addDriven(const HObject& curve, PlugList& plugs) {
    HPlugArray connected;
    if (HFnDependencyNode(curve).getConnections(connected).error())
        return;
    for (const HPlug& source : connected) {
        HPlugArray driven;
        if (!source.isSource() || source.destinations(driven).error())
            continue;
        for (const HPlug& plug : driven)
            plugs.add(plug);
    }
}

std::vector<PlugTrack> movingPlugs(const std::optional<Warp>& warp, const std::vector<SceneJoint>& joints) {
    PlugList plugs;
    for (const SceneJoint& joint : joints)
        addJoint(joint, plugs);
    for (const HObject& curve : drivingCurves())
        addDriven(curve, plugs);
    if (warp && !warp->plug("poseGenerator").source().isNull())
        for (const PoseControl& control : poseControls(poseCollector(*warp)))
            plugs.add(control.plug);
    return plugs.take();
}

void requireRoom(const FrameRange& frames, std::size_t plugs) {
    if (frames.count() > mostNumbers / std::max<std::size_t>(1, plugs))
        throw std::runtime_error(std::to_string(frames.count()) + " frames of " + std::to_string(plugs) +
                                 " plugs are too many to be written: at most " + std::to_string(mostNumbers) +
                                 " numbers can be; choose a part of them with --frames");
}

// a number of a joint in every frame
class Component {
public:
    Component(const Motion& motion, const SceneJoint& joint, const std::string& attribute)
        : track_(motion.find(joint.name + "." + attribute))
        , constant_(track_ == nullptr ? numberOf(plugOf(joint.node, attribute)) : 0.0) {}
    double operator()(std::size_t number) const { return track_ == nullptr ? constant_ : track_->values[number]; }

private:
    const PlugTrack* track_;
    double constant_;
};

class Vector {
public:
    Vector(const Motion& motion, const SceneJoint& joint, const std::string& channel)
        : parts_{Component(motion, joint, channel + axes[0]), Component(motion, joint, channel + axes[1]),
                 Component(motion, joint, channel + axes[2])} {}
    HVector operator()(std::size_t number) const { return {parts_[0](number), parts_[1](number), parts_[2](number)}; }

private:
    std::array<Component, 3> parts_;
};

HQuaternion turn(const HVector& angles, HEulerRotation::RotationOrder order) {
    return HEulerRotation(angles.x, angles.y, angles.z, order).asQuaternion();
}

} // namespace

const PlugTrack* Motion::find(const std::string& name) const {
    const auto found =
        std::find_if(tracks.begin(), tracks.end(), [&](const PlugTrack& track) { return track.name == name; });
    return found == tracks.end() ? nullptr : &*found;
}

Motion readMotion(const std::optional<Warp>& warp, const FrameRange& frames, const Console& console) {
    Motion motion{frames, sceneJoints(), {}};
    motion.tracks = movingPlugs(warp, motion.joints);
    requireRoom(frames, motion.tracks.size());
    for (PlugTrack& track : motion.tracks)
        track.values.reserve(frames.count());
    Progress progress(console, "reading poses", frames.count());
    OpenQuarn::EvaluationContext context(frames.first);
    for (std::size_t number = 0; number < frames.count(); ++number) {
        context.setTime(frames.frame(number));
        for (PlugTrack& track : motion.tracks)
            track.values.push_back(valueAt(context, track.plug, frames.frame(number)));
        progress.advance();
    }
    return motion;
}

std::vector<JointPose> posesOf(const Motion& motion, const SceneJoint& joint) {
    const Vector translate(motion, joint, "translate");
    const Vector rotate(motion, joint, "rotate");
    const Vector orient(motion, joint, "jointOrient");
    const Vector scale(motion, joint, "scale");
    const auto order = static_cast<HEulerRotation::RotationOrder>(wholeNumberOf(plugOf(joint.node, "rotateOrder")));
    std::vector<JointPose> poses(motion.frames.count());
    for (std::size_t number = 0; number < poses.size(); ++number) {
        JointPose& pose = poses[number];
        pose.scale = scale(number);
        pose.translation = translate(number);
        pose.rotation = (turn(rotate(number), order) * turn(orient(number), HEulerRotation::kXYZ)).normal();
        if (number > 0 && pose.rotation.dot(poses[number - 1].rotation) < 0.0)
            pose.rotation = -pose.rotation;
    }
    return poses;
}

JointPose restOf(const SceneJoint& joint, const std::vector<JointPose>& poses) {
    const HMatrix matrix = plugOf(joint.node, "restMatrix").asMatrix();
    if (matrix == HMatrix())
        return poses.front();
    const HTransformationMatrix split(matrix);
    JointPose rest;
    double scale[3] = {1.0, 1.0, 1.0};
    split.getScale(scale, HSpace::kTransform);
    rest.scale = {scale[0], scale[1], scale[2]};
    rest.rotation = HQuaternion::fromMatrix(split.asRotateMatrix());
    if (rest.rotation.dot(poses.front().rotation) < 0.0)
        rest.rotation = -rest.rotation;
    rest.translation = matrix.row(3);
    return rest;
}

} // namespace quarn
