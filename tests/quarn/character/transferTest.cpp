// SPDX-License-Identifier: Apache-2.0
// How a character comes over from the process that the importer may crash.
#include "quarn/character/transfer.h"

#include "quarn/character/characterFiles.h"

#include <gmock/gmock.h>

namespace quarn {
namespace {

Character moving() {
    Character character = read(Strip().write());
    JointChannel channel;
    channel.joint = 1;
    channel.rotation.interpolation = Interpolation::Step;
    channel.rotation.keys = {{0.5, HQuaternion(1.0, {0, 0, 1})}};
    character.meshes[0].morphTargets = {{"smile", 0.25, {1, 5}, {HVector(0, 0, 1), HVector(0, 2, 0)}}};
    character.meshes[0].uvs = {0.25F, 0.5F, 1, 0};
    character.meshes[0].cornerUvs.assign(character.meshes[0].corners.size(), 1);
    character.animations.push_back({"wave", 0.5, {channel}, {{0, 0, {Interpolation::Linear, {{0.5, 1.0}}}}}});
    character.warnings.emplace_back("something is odd");
    return character;
}

TEST(Transfer, ACharacterComesOverAsItIs) {
    const Character before = moving();
    const Character after = unpackCharacter(packCharacter(before));
    EXPECT_EQ(packCharacter(after), packCharacter(before));
    EXPECT_EQ(after.meshes.at(0).points, before.meshes[0].points);
    EXPECT_EQ(after.meshes[0].influences.at(1).at(1).weight, before.meshes[0].influences[1][1].weight);
    EXPECT_EQ(after.joints.at(1).restTransform, before.joints[1].restTransform);
    EXPECT_EQ(after.animations.at(0).channels.at(0).rotation.keys.at(0).value,
              before.animations[0].channels[0].rotation.keys[0].value);
    EXPECT_EQ(after.meshes[0].morphTargets.at(0).deltas, before.meshes[0].morphTargets[0].deltas);
    EXPECT_EQ(after.animations[0].morphs.at(0).weight.keys.at(0).value, 1.0);
    EXPECT_EQ(after.meshes[0].uvs, before.meshes[0].uvs);
    EXPECT_EQ(after.warnings, before.warnings);
}

// every byte changed, and every length: refused, or a character that says just that
TEST(Transfer, DamagedBytesDoNoHarm) {
    const std::string sound = packCharacter(moving());
    for (std::size_t length = 0; length < sound.size(); ++length)
        EXPECT_THROW(unpackCharacter(sound.substr(0, length)), std::runtime_error) << length;
    EXPECT_THROW(unpackCharacter(sound + '\0'), std::runtime_error);
    std::size_t refused = 0;
    for (std::size_t at = 0; at < sound.size(); ++at)
        for (const char change : {'\x01', '\x7f', '\xff'}) {
            std::string damaged = sound;
            damaged[at] = static_cast<char>(damaged[at] ^ change);
            try {
                EXPECT_EQ(packCharacter(unpackCharacter(damaged)), damaged) << at;
            } catch (const std::runtime_error&) {
                ++refused;
            }
        }
    EXPECT_GT(refused, sound.size() / 2); // sizes and indices; the rest are numbers and letters
}

} // namespace
} // namespace quarn
