// SPDX-License-Identifier: Apache-2.0
#include "quarn/pose/gltfPoses.h"

#include "quarn/pose/GltfSkeleton.h"
#include "quarn/scene/units.h"

#include <cmath>
#include <stdexcept>

namespace quarn {
namespace {

using Shape = GltfNumbers::Shape;

HMatrix matrixOf(const JointPose& pose) {
    HMatrix matrix = pose.rotation.asMatrix();
    const double scale[3] = {pose.scale.x, pose.scale.y, pose.scale.z};
    for (unsigned axis = 0; axis < 3; ++axis)
        matrix.setRow(axis, matrix.row(axis) * scale[axis]);
    matrix.setRow(3, pose.translation);
    return matrix;
}

std::vector<double> listed(const HVector& vector) {
    return {vector.x, vector.y, vector.z};
}

std::vector<double> listed(const HQuaternion& rotation) {
    return {rotation.x, rotation.y, rotation.z, rotation.w};
}

class PosesFile {
public:
    PosesFile(const Motion& motion, const FilePlaces& places)
        : motion_(motion)
        , places_(places) {
        skeleton_.metersPerUnit = metersPerUnit();
        if (motion.joints.empty())
            throw std::runtime_error(
                "the scene has no joints: .glb holds poses of a skeleton, .json those of any plugs");
        for (const SceneJoint& joint : motion.joints)
            addJoint(joint);
        addKeys();
        addMeshes();
    }

    void write(std::ostream& out) const { writeSkeleton(out, skeleton_); }
    GltfPosesAnswer answer() const { return {skeleton_.meshes.size(), notes_}; }

private:
    void addJoint(const SceneJoint& joint) {
        if (joint.held)
            throw std::runtime_error("the joint " + joint.name + " hangs below " + *joint.held +
                                     ", which is no joint: a file of a skeleton cannot say where that goes");
        std::vector<JointPose> poses = posesOf(motion_, joint);
        JointPose rest = restOf(joint, poses);
        HMatrix world = matrixOf(rest) * joint.space;
        if (joint.parent >= 0)
            world = matrixOf(rest) * restWorlds_[static_cast<std::size_t>(joint.parent)];
        restWorlds_.push_back(world);
        skeleton_.joints.push_back({joint, rest});
        poses_.push_back(std::move(poses));
    }

    void addKeys() {
        std::vector<float> seconds;
        for (std::size_t number = 0; number < motion_.frames.count(); ++number)
            seconds.push_back(static_cast<float>(places_.seconds(motion_.frames.frame(number))));
        skeleton_.times = skeleton_.numbers.add(seconds, {Shape::scalar, GltfNumbers::Use::plain, true});
        for (std::size_t j = 0; j < skeleton_.joints.size(); ++j) {
            addChannel(j, "translation", Shape::vec3, &JointPose::translation);
            addChannel(j, "rotation", Shape::vec4, &JointPose::rotation);
            addChannel(j, "scale", Shape::vec3, &JointPose::scale);
        }
    }

    template <class Part>
    void addChannel(std::size_t index, const char* path, Shape shape, Part JointPose::*part) {
        const std::vector<double> rest = listed(skeleton_.joints[index].rest.*part);
        bool moves = index == 0 && shape == Shape::vec4; // an animation has at least one
        std::vector<float> keys;
        keys.reserve(rest.size() * poses_[index].size());
        for (const JointPose& pose : poses_[index]) {
            const std::vector<double> now = listed(pose.*part);
            for (std::size_t i = 0; i < now.size(); ++i) {
                constexpr double rounding = 1e-9; // of taking a rest matrix apart
                moves = moves || std::abs(now[i] - rest[i]) > rounding * (1.0 + std::abs(rest[i]));
                keys.push_back(static_cast<float>(now[i]));
            }
        }
        if (moves)
            skeleton_.channels.push_back({index, path, skeleton_.numbers.add(keys, {shape})});
    }

    void addMeshes() {
        for (const SceneSkin& skin : sceneSkins(motion_.joints)) {
            if (const std::string why = whyNotInGltf(skin); !why.empty()) {
                notes_.push_back("the mesh " + skin.mesh + " " + why + ", and is left out");
                continue;
            }
            if (skin.isMoved)
                notes_.push_back("the mesh " + skin.mesh + " is in the file as it comes into " + skin.node +
                                 " now: what moves it before is left out");
            skeleton_.meshes.push_back(addSkinned(skin, restWorlds_, skeleton_.numbers));
        }
        if (skeleton_.meshes.empty())
            notes_.emplace_back("no mesh is in the file, and quarn import needs one");
    }

    const Motion& motion_;
    FilePlaces places_;
    GltfSkeleton skeleton_;
    std::vector<std::vector<JointPose>> poses_; ///< of each joint
    std::vector<HMatrix> restWorlds_;
    std::vector<std::string> notes_;
};

} // namespace

GltfPosesAnswer writeGltfPoses(std::ostream& out, const Motion& motion, const FilePlaces& places) {
    const PosesFile file(motion, places);
    file.write(out);
    return file.answer();
}

} // namespace quarn
