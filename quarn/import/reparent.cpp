// SPDX-License-Identifier: Apache-2.0
#include "quarn/import/reparent.h"

#include "quarn/import/animatedPose.h"
#include "quarn/import/restPose.h"

#include <algorithm>
#include <stdexcept>

namespace quarn {
namespace {

std::string quoted(const std::string& name) {
    return "\"" + name + "\"";
}

// the parent of every joint by index; -1 for a root
std::vector<int> parentsOf(const Character& character) {
    std::vector<int> parents;
    parents.reserve(character.joints.size());
    for (const Joint& joint : character.joints)
        parents.push_back(joint.parent);
    return parents;
}

std::vector<int> changedParents(const Character& character, const ParentMap& map) {
    std::vector<int> parents = parentsOf(character);
    for (const auto& [child, parent] : map)
        parents[jointNamed(character, child)] = static_cast<int>(jointNamed(character, parent));
    return parents;
}

// from a joint up to, and without, the first that is placed already; ends with the topmost
std::vector<std::uint32_t> chainOf(std::uint32_t joint, const Character& character, const std::vector<int>& parents,
                                   const std::vector<bool>& placed) {
    std::vector<std::uint32_t> chain;
    for (int at = static_cast<int>(joint); at >= 0 && !placed[static_cast<std::size_t>(at)];
         at = parents[static_cast<std::size_t>(at)]) {
        if (chain.size() == parents.size())
            throw std::runtime_error("the joint " + quoted(character.joints[static_cast<std::size_t>(at)].name) +
                                     " would hang below itself");
        chain.push_back(static_cast<std::uint32_t>(at));
    }
    return chain;
}

// parents first, and otherwise as they were
std::vector<std::uint32_t> hierarchyOrder(const Character& character, const std::vector<int>& parents) {
    std::vector<std::uint32_t> order;
    std::vector<bool> placed(parents.size(), false);
    order.reserve(parents.size());
    for (std::uint32_t joint = 0; joint < parents.size(); ++joint) {
        const std::vector<std::uint32_t> chain = chainOf(joint, character, parents, placed);
        order.insert(order.end(), chain.rbegin(), chain.rend());
        for (const std::uint32_t each : chain)
            placed[each] = true;
    }
    return order;
}

HMatrix localOf(const Character& character, std::size_t joint, int parent, const std::vector<HMatrix>& world) {
    HStatus status;
    const HMatrix toParent = world[static_cast<std::size_t>(parent)].inverse(&status);
    if (status.error())
        throw std::runtime_error("nothing can hang below the joint " +
                                 quoted(character.joints[static_cast<std::size_t>(parent)].name) +
                                 ": at times its scale is 0");
    return world[joint] * toParent;
}

void addKeys(JointChannel& channel, double seconds, const HMatrix& local) {
    const HVector signs = channel.scale.keys.empty() ? HVector(1.0, 1.0, 1.0) : channel.scale.keys.back().value;
    const JointRest split = splitRest(local, signs);
    channel.translation.keys.push_back({seconds, split.translate});
    channel.rotation.keys.push_back({seconds, split.orient});
    channel.scale.keys.push_back({seconds, split.scale});
}

// gives the joints tracks that keep them where they were in the world, below their new parents
void resample(const Character& character, const std::vector<int>& parents, double framesPerSecond,
              Animation& animation) {
    std::vector<JointChannel> made;
    for (std::uint32_t joint = 0; joint < parents.size(); ++joint)
        if (parents[joint] != character.joints[joint].parent)
            made.push_back({joint, {}, {}, {}});
    const AnimatedPose pose(character, animation);
    for (const double seconds : sampleTimes(animation, framesPerSecond)) {
        const std::vector<HMatrix> world = pose.worlds(seconds);
        for (JointChannel& channel : made)
            addKeys(channel, seconds, localOf(character, channel.joint, parents[channel.joint], world));
    }
    const auto isMade = [&](const JointChannel& channel) {
        return parents[channel.joint] != character.joints[channel.joint].parent;
    };
    std::vector<JointChannel>& channels = animation.channels;
    channels.erase(std::remove_if(channels.begin(), channels.end(), isMade), channels.end());
    channels.insert(channels.end(), made.begin(), made.end());
}

void renumber(Character& character, const std::vector<std::uint32_t>& newIndex) {
    for (CharacterMesh& mesh : character.meshes) {
        for (Binding& binding : mesh.bindings)
            binding.joint = newIndex[binding.joint];
        std::sort(mesh.bindings.begin(), mesh.bindings.end(),
                  [](const Binding& a, const Binding& b) { return a.joint < b.joint; });
        for (std::vector<Influence>& influences : mesh.influences) {
            for (Influence& influence : influences)
                influence.joint = newIndex[influence.joint];
            std::sort(influences.begin(), influences.end(),
                      [](const Influence& a, const Influence& b) { return a.joint < b.joint; });
        }
        if (mesh.parentJoint >= 0)
            mesh.parentJoint = static_cast<int>(newIndex[static_cast<std::size_t>(mesh.parentJoint)]);
    }
    for (Animation& animation : character.animations)
        for (JointChannel& channel : animation.channels)
            channel.joint = newIndex[channel.joint];
}

void rebuildJoints(Character& character, const std::vector<int>& parents, const std::vector<std::uint32_t>& order) {
    const std::vector<HMatrix> world = restWorlds(character);
    std::vector<std::uint32_t> newIndex(order.size());
    for (std::uint32_t place = 0; place < order.size(); ++place)
        newIndex[order[place]] = place;
    std::vector<Joint> joints;
    joints.reserve(order.size());
    for (const std::uint32_t old : order) {
        const int parent = parents[old];
        joints.push_back({character.joints[old].name,
                          parent < 0 ? -1 : static_cast<int>(newIndex[static_cast<std::size_t>(parent)]),
                          parent == character.joints[old].parent ? character.joints[old].restTransform
                                                                 : localOf(character, old, parent, world)});
    }
    character.joints = std::move(joints);
    renumber(character, newIndex);
}

} // namespace

void reparent(Character& character, const ParentMap& map, double framesPerSecond) {
    const std::vector<int> parents = changedParents(character, map);
    const std::vector<std::uint32_t> order = hierarchyOrder(character, parents);
    std::vector<Animation> animations = character.animations;
    for (Animation& animation : animations)
        resample(character, parents, framesPerSecond, animation);
    character.animations = std::move(animations);
    rebuildJoints(character, parents, order);
}

} // namespace quarn
