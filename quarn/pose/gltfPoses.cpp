// SPDX-License-Identifier: Apache-2.0
#include "quarn/pose/gltfPoses.h"

#include "quarn/pose/GltfSkeleton.h"
#include "quarn/pose/valueAt.h"
#include "quarn/scene/units.h"

#include <algorithm>
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
        for (const SceneJoint& joint : motion.joints)
            addJoint(joint);
        addKeys();
        addMeshes();
    }

    void write(std::ostream& out) const { writeSkeleton(out, skeleton_); }
    GltfPosesAnswer answer() const { return {skeleton_.meshes.size(), weights_, notes_}; }

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
        const std::vector<SceneShapes> shapes = sceneShapes();
        const std::vector<SceneSkin> skins = sceneSkins(motion_.joints);
        for (const SceneSkin& skin : skins)
            addSkin(skin, shapes);
        for (const SceneShapes& each : shapes) {
            const auto takesIt = [&](const SceneSkin& skin) { return skin.input.source() == each.output; };
            if (std::any_of(skins.begin(), skins.end(), takesIt))
                continue;
            skeleton_.meshes.push_back(addMorphed(each, skeleton_.numbers));
            addWeights(each);
        }
        if (skeleton_.meshes.empty())
            notes_.emplace_back("no mesh is in the file, and quarn import needs one");
        if (motion_.joints.empty() && skeleton_.meshes.empty())
            throw std::runtime_error("the scene has no joints, and no mesh whose only weights are those of morph "
                                     "targets: .glb holds poses of these, .json those of any plugs");
    }

    void addSkin(const SceneSkin& skin, const std::vector<SceneShapes>& all) {
        if (const std::string why = whyNotInGltf(skin); !why.empty())
            return notes_.push_back("the mesh " + skin.mesh + " " + why + ", and is left out");
        const auto shapes = std::find_if(all.begin(), all.end(),
                                         [&](const SceneShapes& each) { return each.output == skin.input.source(); });
        const bool morphs = shapes != all.end();
        if (skin.isMoved && !morphs)
            notes_.push_back("the mesh " + skin.mesh + " is in the file as it comes into " + skin.node +
                             " now: what moves it before is left out");
        skeleton_.meshes.push_back(addSkinned(skin, morphs ? &*shapes : nullptr, restWorlds_, skeleton_.numbers));
        if (morphs)
            addWeights(*shapes);
    }

    // keys of the mesh that was added last, frame by frame
    void addWeights(const SceneShapes& shapes) {
        std::vector<float> keys;
        OpenQuarn::EvaluationContext context(motion_.frames.first);
        for (std::size_t number = 0; number < motion_.frames.count(); ++number) {
            const int frame = motion_.frames.frame(number);
            context.setTime(frame);
            for (const SceneShapes::Shape& shape : shapes.shapes)
                keys.push_back(static_cast<float>(valueAt(context, shape.weight, frame)));
        }
        skeleton_.meshes.back().weightKeys = skeleton_.numbers.add(keys, {Shape::scalar});
        for (const SceneShapes::Shape& shape : shapes.shapes)
            weights_.push_back(shape.control);
    }

    const Motion& motion_;
    FilePlaces places_;
    GltfSkeleton skeleton_;
    std::vector<std::vector<JointPose>> poses_; ///< of each joint
    std::vector<HMatrix> restWorlds_;
    std::vector<HPlug> weights_;
    std::vector<std::string> notes_;
};

} // namespace

GltfPosesAnswer writeGltfPoses(std::ostream& out, const Motion& motion, const FilePlaces& places) {
    const PosesFile file(motion, places);
    file.write(out);
    return file.answer();
}

} // namespace quarn
