// SPDX-License-Identifier: Apache-2.0
#include "quarn/import/RandomCharacter.h"

#include <set>

namespace quarn {
namespace {

class Chance {
public:
    explicit Chance(unsigned seed)
        : engine_(seed) {}
    double from(double least, double largest) {
        return least + (largest - least) * static_cast<double>(engine_()) / static_cast<double>(std::mt19937::max());
    }
    int below(int count) { return static_cast<int>(from(0.0, count - 1e-9)); }
    HVector vector(double size) { return {from(-size, size), from(-size, size), from(-size, size)}; }
    HQuaternion rotation() { return HQuaternion(from(-2.5, 2.5), vector(1.0)); }
    HVector scale(const CharacterKind& kind, const HVector& signs) {
        if (kind.evenScale)
            return HVector(1, 1, 1) * from(0.5, 2.0);
        return {signs.x * from(0.5, 2.0), signs.y * from(0.5, 2.0), signs.z * from(0.5, 2.0)};
    }
    HVector signs() { return {below(2) - 0.5, below(2) - 0.5, below(2) - 0.5}; }

private:
    std::mt19937 engine_;
};

HMatrix composed(const HVector& scale, const HQuaternion& rotation, const HVector& translation) {
    HMatrix matrix = rotation.asMatrix();
    for (unsigned axis = 0; axis < 3; ++axis)
        matrix.setRow(axis, matrix.row(axis) * scale[axis]);
    matrix.setRow(3, translation);
    return matrix;
}

void addJoint(Chance& chance, const CharacterKind& kind, Character& character) {
    const int index = static_cast<int>(character.joints.size());
    const HVector signs = chance.signs();
    const int parent = kind.flat || index == 0 ? -1 : chance.below(index);
    character.joints.push_back({"joint" + std::to_string(index), parent,
                                composed(chance.scale(kind, signs), chance.rotation(), chance.vector(2.0))});
    if (index % 3 == 2)
        return; // stays at rest
    JointChannel channel;
    channel.joint = static_cast<std::uint32_t>(index);
    channel.rotation.interpolation = index % 2 == 0 ? Interpolation::Linear : Interpolation::Step;
    for (const double seconds : {0.1, 0.4, 1.0}) {
        channel.translation.keys.push_back({seconds, chance.vector(2.0)});
        channel.rotation.keys.push_back({seconds, chance.rotation()});
        channel.scale.keys.push_back({seconds, chance.scale(kind, signs)});
    }
    character.animations[0].channels.push_back(channel);
}

CharacterMesh makeMesh(Chance& chance, const CharacterKind& kind, const Character& character, const HMatrix& space) {
    CharacterMesh mesh;
    const std::vector<HMatrix> worlds = plainWorlds(character, kind.boundAtRest ? -1.0 : 0.7);
    for (std::uint32_t joint = 0; joint < worlds.size(); ++joint)
        mesh.bindings.push_back({joint, space * worlds[joint].inverse()});
    for (std::uint32_t vertex = 0; vertex < 30; ++vertex) {
        const HVector place = chance.vector(1.0);
        mesh.points.emplace_back(place.x, place.y, place.z);
        mesh.joinedOf.push_back(vertex);
        std::set<std::uint32_t> joints;
        for (int i = 0; i < (vertex == 7 ? 0 : 6); ++i)
            joints.insert(static_cast<std::uint32_t>(chance.below(static_cast<int>(worlds.size()))));
        mesh.influences.emplace_back();
        for (const std::uint32_t joint : joints)
            mesh.influences.back().push_back({joint, chance.from(0.1, 1.0)});
    }
    mesh.polygonSizes = {3, 4};
    mesh.corners = {0, 1, 2, 3, 4, 5, 6};
    return mesh;
}

HMatrix plainLocal(const Character& character, std::size_t joint, double seconds) {
    const auto value = [&](const auto& track, auto between) {
        std::size_t next = 0;
        while (next < track.keys.size() && track.keys[next].seconds <= seconds)
            ++next;
        if (next == 0)
            return track.keys[0].value;
        const auto& from = track.keys[next - 1];
        if (next == track.keys.size() || track.interpolation == Interpolation::Step)
            return from.value;
        const auto& to = track.keys[next];
        return between(from.value, to.value, (seconds - from.seconds) / (to.seconds - from.seconds));
    };
    const auto straight = [](const HVector& a, const HVector& b, double t) { return a + (b - a) * t; };
    if (seconds >= 0.0)
        for (const JointChannel& channel : character.animations.at(0).channels)
            if (channel.joint == joint)
                return composed(value(channel.scale, straight), value(channel.rotation, HQuaternion::slerp),
                                value(channel.translation, straight));
    return character.joints[joint].restTransform;
}

} // namespace

Character randomCharacter(unsigned seed, const CharacterKind& kind) {
    Chance chance(seed);
    Character character;
    character.animations.push_back({"dance", 1.0, {}});
    for (int i = 0; i < kind.joints; ++i)
        addJoint(chance, kind, character);
    character.meshes.push_back(makeMesh(chance, kind, character, HMatrix()));
    character.meshes.push_back(
        makeMesh(chance, kind, character, composed({0.01, -0.01, 0.01}, chance.rotation(), chance.vector(1.0))));
    character.meshes[0].name = "skin";
    character.meshes[1].name = "coat";
    return character;
}

std::vector<HMatrix> plainWorlds(const Character& character, double seconds) {
    std::vector<HMatrix> worlds;
    for (std::size_t joint = 0; joint < character.joints.size(); ++joint) {
        const int parent = character.joints[joint].parent;
        const HMatrix local = plainLocal(character, joint, seconds);
        worlds.push_back(parent < 0 ? local : local * worlds[static_cast<std::size_t>(parent)]);
    }
    return worlds;
}

HPoint plainPoint(const CharacterMesh& mesh, const std::vector<HMatrix>& worlds, std::size_t vertex) {
    HVector sum;
    double weights = 0.0;
    for (const Influence& influence : mesh.influences[vertex])
        for (const Binding& binding : mesh.bindings)
            if (binding.joint == influence.joint) {
                const HPoint moved = mesh.points[vertex] * binding.inverseBind * worlds[binding.joint];
                sum = sum + HVector(moved.x, moved.y, moved.z) * influence.weight;
                weights += influence.weight;
            }
    return {sum.x / weights, sum.y / weights, sum.z / weights};
}

} // namespace quarn
