// SPDX-License-Identifier: Apache-2.0
// The format: a HIERARCHY of ROOT and JOINT with an OFFSET from the parent and CHANNELS, ended by End Site, and a
// MOTION of one line a frame. Rotations are about the joint's moving axes: with "Zrotation Xrotation Yrotation" and
// column vectors R = Rz * Rx * Ry, which for row vectors turns about y first, then x, then z.
#include "quarn/pose/bvhPoses.h"

#include "quarn/console/numberText.h"

#include <charconv>
#include <cmath>
#include <ostream>
#include <stdexcept>
#include <utility>

namespace quarn {
namespace {

constexpr double degreesPerRadian = 180.0 / 3.14159265358979323846;

class BvhFile {
public:
    BvhFile(const Motion& motion, const FilePlaces& places)
        : motion_(motion)
        , places_(places)
        , below_(motion.joints.size()) {
        for (std::size_t j = 0; j < motion.joints.size(); ++j)
            addJoint(j);
        if (roots_.size() != 1)
            throw std::runtime_error("the skeleton has " + std::to_string(roots_.size()) +
                                     " roots, and .bvh holds one: write .glb, or hang them below one joint with "
                                     "quarn import --parents");
    }

    void write(std::ostream& out) {
        out << "HIERARCHY\n";
        writeJoint(out, roots_.front(), "");
        out << "MOTION\nFrames: " << motion_.frames.count()
            << "\nFrame Time: " << number(motion_.frames.step / places_.perSecond) << '\n';
        for (std::size_t frame = 0; frame < motion_.frames.count(); ++frame)
            writeFrame(out, frame);
    }

private:
    void addJoint(std::size_t index) {
        const SceneJoint& joint = motion_.joints[index];
        if (joint.parent >= 0)
            below_[static_cast<std::size_t>(joint.parent)].push_back(index);
        else
            roots_.push_back(index);
        if (joint.held || joint.space != HMatrix())
            throw std::runtime_error("the parentMatrix of " + joint.name +
                                     " places it, which .bvh cannot say: write .glb");
        poses_.push_back(posesOf(motion_, joint));
        for (std::size_t frame = 0; frame < poses_.back().size(); ++frame)
            requireUnscaled(joint, poses_.back()[frame].scale, motion_.frames.frame(frame));
    }

    static void requireUnscaled(const SceneJoint& joint, const HVector& scale, int frame) {
        constexpr double rounding = 1e-6;
        for (unsigned axis = 0; axis < 3; ++axis)
            if (std::abs(scale[axis] - 1.0) > rounding)
                throw std::runtime_error("the joint " + joint.name + " has a scale of " + numberText(scale[axis]) +
                                         " in frame " + std::to_string(frame) + ", and .bvh has no scale: write .glb");
    }

    static std::string number(double value) {
        char text[32];
        return {text, std::to_chars(text, text + sizeof text, value == 0.0 ? 0.0 : value).ptr};
    }

    static std::string vector(const HVector& values) {
        return number(values.x) + " " + number(values.y) + " " + number(values.z);
    }

    void writeJoint(std::ostream& out, std::size_t index, const std::string& indent) {
        const std::string inner = indent + "  ";
        out << indent << (indent.empty() ? "ROOT " : "JOINT ") << motion_.joints[index].name << '\n'
            << indent << "{\n"
            << inner << "OFFSET " << vector(restOf(motion_.joints[index], poses_[index]).translation) << '\n'
            << inner << "CHANNELS 6 Xposition Yposition Zposition Zrotation Xrotation Yrotation\n";
        order_.push_back(index);
        for (const std::size_t child : below_[index])
            writeJoint(out, child, inner);
        if (below_[index].empty())
            out << inner << "End Site\n" << inner << "{\n" << inner << "  OFFSET 0 0 0\n" << inner << "}\n";
        out << indent << "}\n";
    }

    void writeFrame(std::ostream& out, std::size_t frame) const {
        const char* between = "";
        for (const std::size_t index : order_) {
            const JointPose& pose = poses_[index][frame];
            const HEulerRotation angles = pose.rotation.asEulerRotation(HEulerRotation::kYXZ);
            out << std::exchange(between, " ") << vector(pose.translation) << ' '
                << vector(HVector(angles.z, angles.x, angles.y) * degreesPerRadian);
        }
        out << '\n';
    }

    const Motion& motion_;
    FilePlaces places_;
    std::vector<std::vector<std::size_t>> below_; ///< children of each joint
    std::vector<std::size_t> roots_;
    std::vector<std::vector<JointPose>> poses_; ///< of each joint
    std::vector<std::size_t> order_;            ///< joints as they stand in the hierarchy
};

} // namespace

void writeBvhPoses(std::ostream& out, const Motion& motion, const FilePlaces& places) {
    BvhFile(motion, places).write(out);
}

} // namespace quarn
