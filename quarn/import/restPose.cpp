// SPDX-License-Identifier: Apache-2.0
#include "quarn/import/restPose.h"

#include "openquarn/HTransformationMatrix.h"

#include <algorithm>
#include <cmath>
#include <stdexcept>

namespace quarn {
namespace {

std::vector<HMatrix> chained(const Character& character, std::vector<HMatrix> matrices) {
    for (std::size_t joint = 0; joint < matrices.size(); ++joint)
        if (const int parent = character.joints[joint].parent; parent >= 0)
            matrices[joint] *= matrices[static_cast<std::size_t>(parent)];
    return matrices;
}

std::string someNames(const Character& character) {
    constexpr std::size_t shown = 8;
    std::string names;
    for (std::size_t i = 0; i < std::min(shown, character.joints.size()); ++i)
        names += (i == 0 ? "" : ", ") + character.joints[i].name;
    return names + (character.joints.size() > shown ? ", ..." : "");
}

double sign(double value) {
    return std::signbit(value) ? -1.0 : 1.0;
}

} // namespace

std::size_t jointNamed(const Character& character, const std::string& name) {
    const auto found = std::find_if(character.joints.begin(), character.joints.end(),
                                    [&](const Joint& joint) { return joint.name == name; });
    if (found == character.joints.end())
        throw std::runtime_error("there is no joint \"" + name + "\"; the file has " +
                                 std::to_string(character.joints.size()) + ": " + someNames(character));
    return static_cast<std::size_t>(found - character.joints.begin());
}

std::vector<HMatrix> restWorlds(const Character& character) {
    std::vector<HMatrix> matrices;
    matrices.reserve(character.joints.size());
    for (const Joint& joint : character.joints)
        matrices.push_back(joint.restTransform);
    return chained(character, std::move(matrices));
}

HMatrix JointRest::matrix() const {
    HMatrix result = orient.asMatrix();
    for (unsigned axis = 0; axis < 3; ++axis)
        result.setRow(axis, result.row(axis) * scale[axis]);
    result.setRow(3, translate);
    return result;
}

JointRest splitRest(const HMatrix& transform, const HVector& signs) {
    const HTransformationMatrix split(transform);
    double scale[3] = {1.0, 1.0, 1.0};
    double shear[3] = {0.0, 0.0, 0.0};
    split.getScale(scale, HSpace::kTransform);
    split.getShear(shear, HSpace::kTransform);
    // the host turns all three or none; two signs of a scale and half a turn are the same
    const bool fits = sign(signs.x) * sign(signs.y) * sign(signs.z) == sign(scale[0]) * sign(scale[1]) * sign(scale[2]);
    HMatrix rotation = split.asRotateMatrix();
    JointRest rest;
    for (unsigned axis = 0; axis < 3; ++axis) {
        const double turned = fits ? sign(signs[axis]) * sign(scale[axis]) : 1.0;
        rest.scale[axis] = scale[axis] * turned;
        rotation.setRow(axis, rotation.row(axis) * turned);
        rest.shear = std::max(rest.shear, std::abs(shear[axis]));
    }
    rest.orient = HQuaternion::fromMatrix(rotation);
    rest.translate = transform.row(3);
    return rest;
}

std::vector<JointRest> splitRests(const Character& character, const Animation* animation) {
    std::vector<HVector> signs(character.joints.size(), HVector(1.0, 1.0, 1.0));
    if (animation != nullptr)
        for (const JointChannel& channel : animation->channels)
            if (!channel.scale.keys.empty())
                signs[channel.joint] = channel.scale.keys.front().value;
    std::vector<JointRest> rests;
    rests.reserve(character.joints.size());
    for (std::size_t joint = 0; joint < character.joints.size(); ++joint)
        rests.push_back(splitRest(character.joints[joint].restTransform, signs[joint]));
    return rests;
}

std::vector<HMatrix> sceneWorlds(const Character& character, const std::vector<JointRest>& rests) {
    std::vector<HMatrix> matrices;
    matrices.reserve(rests.size());
    for (const JointRest& rest : rests)
        matrices.push_back(rest.matrix());
    return chained(character, std::move(matrices));
}

} // namespace quarn
