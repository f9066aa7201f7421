// SPDX-License-Identifier: Apache-2.0
#include "quarn/character/transfer.h"

#include "quarn/process/answerBytes.h"

#include <algorithm>
#include <cmath>
#include <stdexcept>
#include <type_traits>

namespace quarn {
namespace {

[[noreturn]] void refuse() {
    throw std::runtime_error("what the importer made of the file is damaged");
}

} // namespace

// One list of members for both ways; `Item` is const on the way out. Found by the archive beside their classes.

template <class Archive, class Item>
requires std::is_same_v<std::remove_const_t<Item>, Joint>
void transfer(Archive& archive, Item& joint) {
    archive(joint.name);
    archive(joint.parent);
    archive(joint.restTransform);
    archive(joint.sourceNode);
}
template <class Archive, class Item>
requires std::is_same_v<std::remove_const_t<Item>, MorphTarget>
void transfer(Archive& archive, Item& target) {
    archive(target.name);
    archive(target.restWeight);
    archive(target.vertices);
    archive(target.deltas);
}
template <class Archive, class Item>
requires std::is_same_v<std::remove_const_t<Item>, CharacterMesh>
void transfer(Archive& archive, Item& mesh) {
    archive(mesh.name);
    archive(mesh.points);
    archive(mesh.polygonSizes);
    archive(mesh.corners);
    archive(mesh.uvs);
    archive(mesh.cornerUvs);
    archive(mesh.influences);
    archive(mesh.bindings);
    archive(mesh.morphTargets);
    archive(mesh.joinedOf);
    archive(mesh.fileOrder);
    archive(mesh.worldTransform);
    archive(mesh.parentJoint);
    archive(mesh.sourceNode);
}
template <class Archive, class Item>
requires std::is_same_v<std::remove_const_t<Item>, JointChannel>
void transfer(Archive& archive, Item& channel) {
    archive(channel.joint);
    const auto track = [&](auto& each) {
        archive(each.interpolation);
        archive(each.keys);
    };
    track(channel.translation);
    track(channel.rotation);
    track(channel.scale);
}
template <class Archive, class Item>
requires std::is_same_v<std::remove_const_t<Item>, MorphChannel>
void transfer(Archive& archive, Item& channel) {
    archive(channel.mesh);
    archive(channel.target);
    archive(channel.weight.interpolation);
    archive(channel.weight.keys);
}
template <class Archive, class Item>
requires std::is_same_v<std::remove_const_t<Item>, Animation>
void transfer(Archive& archive, Item& animation) {
    archive(animation.name);
    archive(animation.seconds);
    archive(animation.channels);
    archive(animation.morphs);
}
template <class Archive, class Item>
requires std::is_same_v<std::remove_const_t<Item>, Character>
void transfer(Archive& archive, Item& character) {
    archive(character.joints);
    archive(character.meshes);
    archive(character.animations);
    archive(character.metersPerUnit);
    archive(character.warnings);
}

namespace {

// --- what Character.h promises of indices ----------------------------------------------------------------------------

void require(bool holds) {
    if (!holds)
        refuse();
}

bool allBelow(const std::vector<std::uint32_t>& indices, std::size_t limit) {
    return std::all_of(indices.begin(), indices.end(), [&](std::uint32_t index) { return index < limit; });
}

void checkMesh(const CharacterMesh& mesh, std::size_t joints) {
    std::size_t corners = 0;
    for (const std::uint32_t size : mesh.polygonSizes)
        corners += size;
    require(corners == mesh.corners.size());
    require(allBelow(mesh.corners, mesh.points.size()) && allBelow(mesh.joinedOf, mesh.points.size()));
    require(mesh.uvs.size() % 2 == 0 && allBelow(mesh.cornerUvs, mesh.uvs.size() / 2));
    require(mesh.cornerUvs.size() == (mesh.uvs.empty() ? 0 : corners));
    require(std::all_of(mesh.uvs.begin(), mesh.uvs.end(), [](float value) { return std::isfinite(value); }));
    require(mesh.influences.size() == mesh.points.size());
    require(mesh.fileOrder <= FileOrder::corners);
    std::vector<bool> isBound(joints, false);
    for (const Binding& binding : mesh.bindings) {
        require(binding.joint < joints);
        isBound[binding.joint] = true;
    }
    for (const std::vector<Influence>& influences : mesh.influences)
        for (const Influence& influence : influences)
            require(influence.joint < joints && isBound[influence.joint]);
    for (const MorphTarget& target : mesh.morphTargets)
        require(target.vertices.size() == target.deltas.size() && allBelow(target.vertices, mesh.points.size()));
    require(mesh.parentJoint >= -1 && mesh.parentJoint < static_cast<int>(joints) && mesh.sourceNode >= -1);
}

template <class Value>
void checkTrack(const Track<Value>& track) {
    require(track.interpolation == Interpolation::Linear || track.interpolation == Interpolation::Step);
}

void checkAnimation(const Character& character, const Animation& animation) {
    for (const JointChannel& channel : animation.channels) {
        require(channel.joint < character.joints.size());
        checkTrack(channel.translation);
        checkTrack(channel.rotation);
        checkTrack(channel.scale);
    }
    for (const MorphChannel& channel : animation.morphs) {
        require(channel.mesh < character.meshes.size() &&
                channel.target < character.meshes[channel.mesh].morphTargets.size());
        checkTrack(channel.weight);
    }
}

void checkIndices(const Character& character) {
    for (std::size_t index = 0; index < character.joints.size(); ++index) {
        const Joint& joint = character.joints[index];
        require(joint.parent >= -1 && joint.parent < static_cast<int>(index) && joint.sourceNode >= -1);
    }
    for (const CharacterMesh& mesh : character.meshes)
        checkMesh(mesh, character.joints.size());
    for (const Animation& animation : character.animations)
        checkAnimation(character, animation);
}

} // namespace

std::string packCharacter(const Character& character) {
    Packer packer;
    transfer(packer, character);
    return packer.take();
}

Character unpackCharacter(std::string_view bytes) {
    Unpacker unpacker(bytes);
    Character character;
    try {
        transfer(unpacker, character);
    } catch (const DamagedAnswer&) {
        refuse();
    }
    require(unpacker.atEnd());
    checkIndices(character);
    return character;
}

} // namespace quarn
