// SPDX-License-Identifier: Apache-2.0
#include "characterTargets.h"

#include "quarn/character/colladaMeshes.h"
#include "quarn/character/fbxMeshes.h"
#include "quarn/character/prepareGltf.h"
#include "quarn/character/transfer.h"
#include "require.h"

#include <algorithm>
#include <numeric>
#include <stdexcept>
#include <string>

namespace {

using namespace quarn;

// a triangle that follows the second of two joints, which turns
std::string soundAnswer() {
    Character character;
    character.joints = {{"root", -1, {}}, {"tip", 0, {}}};
    CharacterMesh mesh;
    mesh.name = "arm";
    mesh.points = {HPoint(0, 0, 0), HPoint(1, 0, 0), HPoint(0, 1, 0)};
    mesh.polygonSizes = {3};
    mesh.corners = {0, 1, 2};
    mesh.influences = {{{1, 1.0}}, {{1, 0.5}}, {}};
    mesh.bindings = {{1, {}}};
    mesh.joinedOf = {0, 1, 2, 0};
    character.meshes = {mesh};
    JointChannel channel;
    channel.joint = 1;
    channel.rotation.keys = {{0.5, {}}, {1.0, {}}};
    character.animations = {{"turn", 1.0, {channel}}};
    character.warnings = {"odd"};
    return packCharacter(character);
}

std::string changedAnswer(const std::uint8_t* data, std::size_t size) {
    static const std::string sound = soundAnswer();
    std::string changed = sound;
    for (std::size_t at = 0; at + 2 < size; at += 3) {
        const std::size_t place = (std::size_t{data[at]} << 8U | data[at + 1]) % changed.size();
        changed[place] = static_cast<char>(data[at + 2]);
    }
    return changed;
}

void requireInRange(const Character& character) {
    for (const CharacterMesh& mesh : character.meshes) {
        require(mesh.influences.size() == mesh.points.size());
        require(std::all_of(mesh.corners.begin(), mesh.corners.end(), [&](auto i) { return i < mesh.points.size(); }));
        for (const Binding& binding : mesh.bindings)
            require(binding.joint < character.joints.size());
    }
}

bool haveSoundPolygons(const std::vector<ControlMesh>& meshes) {
    for (const ControlMesh& mesh : meshes) {
        for (const std::uint32_t corner : mesh.corners)
            require(3 * std::size_t{corner} + 2 < mesh.points.size());
        require(std::accumulate(mesh.polygonSizes.begin(), mesh.polygonSizes.end(), std::size_t{0}) ==
                mesh.corners.size());
    }
    return !meshes.empty();
}

std::string noOtherFile(const std::string& uri) {
    throw std::runtime_error("no file " + uri);
}

} // namespace

bool fuzzGltf(const std::uint8_t* data, std::size_t size) {
    const std::string bytes(reinterpret_cast<const char*>(data), size); // of exact size, for the sanitizer
    SourceHints hints;
    std::string prepared;
    try {
        prepared = prepareGltf(bytes, hints, noOtherFile);
    } catch (const std::runtime_error&) {
        return false;
    }
    SourceHints again;
    prepareGltf(prepared, again, noOtherFile);
    require(again.nodeNames.size() == hints.nodeNames.size());
    for (const auto& [imported, name] : again.nodeNames)
        require(name == imported && hints.nodeNames.count(imported) == 1);
    return true;
}

bool fuzzControlMeshes(const std::uint8_t* data, std::size_t size) {
    const std::string bytes(reinterpret_cast<const char*>(data), size); // of exact size, for the sanitizer
    bool hasSome = false;
    for (const auto& read : {readFbxMeshes, readColladaMeshes}) {
        try {
            hasSome = haveSoundPolygons(read(bytes)) || hasSome;
        } catch (const std::runtime_error&) {
            continue; // not of this format, or damaged
        }
    }
    return hasSome;
}

bool fuzzCharacterAnswer(const std::uint8_t* data, std::size_t size) {
    const bool isWhole = size > 0 && data[0] == 'r';
    if (!isWhole && (size == 0 || data[0] != 'e'))
        return false;
    const std::string bytes =
        isWhole ? std::string(reinterpret_cast<const char*>(data) + 1, size - 1) : changedAnswer(data + 1, size - 1);
    Character character;
    try {
        character = unpackCharacter(bytes);
    } catch (const std::runtime_error&) {
        return false;
    }
    requireInRange(character);
    require(packCharacter(character) == bytes);
    return true;
}
