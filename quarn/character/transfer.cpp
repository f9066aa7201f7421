// SPDX-License-Identifier: Apache-2.0
#include "quarn/character/transfer.h"

#include <algorithm>
#include <cmath>
#include <cstring>
#include <stdexcept>
#include <type_traits>

namespace quarn {
namespace {

[[noreturn]] void refuse() {
    throw std::runtime_error("what the importer made of the file is damaged");
}

// what has no pointer in it goes as it is in memory
template <class T>
constexpr bool isPlain = std::is_trivially_copyable_v<T>;

class Packer {
public:
    template <class T>
    void operator()(const T& value) {
        static_assert(isPlain<T>);
        bytes_.append(reinterpret_cast<const char*>(&value), sizeof value);
    }
    void operator()(const std::string& text) {
        operator()(text.size());
        bytes_ += text;
    }
    template <class T>
    void operator()(const std::vector<T>& values) {
        operator()(values.size());
        if constexpr (isPlain<T>)
            bytes_.append(reinterpret_cast<const char*>(values.data()), values.size() * sizeof(T));
        else
            for (const T& value : values)
                transfer(*this, value);
    }
    std::string take() { return std::move(bytes_); }

private:
    std::string bytes_;
};

class Unpacker {
public:
    explicit Unpacker(std::string_view bytes)
        : bytes_(bytes) {}

    template <class T>
    void operator()(T& value) {
        static_assert(isPlain<T>);
        copy(&value, sizeof value);
    }
    void operator()(std::string& text) {
        text.resize(count(1));
        copy(text.data(), text.size());
    }
    template <class T>
    void operator()(std::vector<T>& values) {
        if constexpr (isPlain<T>) {
            values.resize(count(sizeof(T)));
            copy(values.data(), values.size() * sizeof(T));
        } else {
            // one by one, as far as there are bytes: each takes at least those of a size
            const std::size_t size = count(sizeof(std::size_t));
            values.clear();
            for (std::size_t i = 0; i < size; ++i)
                transfer(*this, values.emplace_back());
        }
    }
    bool atEnd() const { return bytes_.empty(); }

private:
    // of elements that take at least `least` bytes each: never more than there can be
    std::size_t count(std::size_t least) {
        std::size_t number = 0;
        copy(&number, sizeof number);
        if (number > bytes_.size() / least)
            refuse();
        return number;
    }
    void copy(void* to, std::size_t size) {
        if (size > bytes_.size())
            refuse();
        if (size > 0)
            std::memcpy(to, bytes_.data(), size);
        bytes_.remove_prefix(size);
    }

    std::string_view bytes_;
};

// one list of members for both ways; `Item` is const on the way out
template <class Archive, class T>
void transfer(Archive& archive, std::vector<T>& values) {
    archive(values);
}
template <class Archive, class T>
void transfer(Archive& archive, const std::vector<T>& values) {
    archive(values);
}
template <class Archive, class Text>
requires std::is_same_v<std::remove_const_t<Text>, std::string>
void transfer(Archive& archive, Text& text) {
    archive(text);
}
template <class Archive, class Item>
requires std::is_same_v<std::remove_const_t<Item>, Joint>
void transfer(Archive& archive, Item& joint) {
    archive(joint.name);
    archive(joint.parent);
    archive(joint.restTransform);
}
template <class Archive, class Item>
requires std::is_same_v<std::remove_const_t<Item>, CharacterMesh>
void transfer(Archive& archive, Item& mesh) {
    archive(mesh.name);
    archive(mesh.points);
    archive(mesh.polygonSizes);
    archive(mesh.corners);
    archive(mesh.influences);
    archive(mesh.bindings);
    archive(mesh.joinedOf);
    archive(mesh.worldTransform);
    archive(mesh.parentJoint);
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
requires std::is_same_v<std::remove_const_t<Item>, Animation>
void transfer(Archive& archive, Item& animation) {
    archive(animation.name);
    archive(animation.seconds);
    archive(animation.channels);
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
    require(mesh.influences.size() == mesh.points.size());
    std::vector<bool> isBound(joints, false);
    for (const Binding& binding : mesh.bindings) {
        require(binding.joint < joints);
        isBound[binding.joint] = true;
    }
    for (const std::vector<Influence>& influences : mesh.influences)
        for (const Influence& influence : influences)
            require(influence.joint < joints && isBound[influence.joint]);
    require(mesh.parentJoint >= -1 && mesh.parentJoint < static_cast<int>(joints));
}

template <class Value>
void checkTrack(const Track<Value>& track) {
    require(track.interpolation == Interpolation::Linear || track.interpolation == Interpolation::Step);
}

void checkIndices(const Character& character) {
    for (std::size_t joint = 0; joint < character.joints.size(); ++joint)
        require(character.joints[joint].parent >= -1 && character.joints[joint].parent < static_cast<int>(joint));
    for (const CharacterMesh& mesh : character.meshes)
        checkMesh(mesh, character.joints.size());
    for (const Animation& animation : character.animations)
        for (const JointChannel& channel : animation.channels) {
            require(channel.joint < character.joints.size());
            checkTrack(channel.translation);
            checkTrack(channel.rotation);
            checkTrack(channel.scale);
        }
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
    transfer(unpacker, character);
    require(unpacker.atEnd());
    checkIndices(character);
    return character;
}

} // namespace quarn
