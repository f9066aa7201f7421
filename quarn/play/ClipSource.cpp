// SPDX-License-Identifier: Apache-2.0
#include "quarn/play/ClipSource.h"

#include "quarn/character/gltfJson.h"
#include "quarn/character/readApart.h"
#include "quarn/character/readCharacter.h"
#include "quarn/scene/plugs.h"
#include "quarn/scene/vertexMap.h"

#include <algorithm>
#include <cctype>
#include <filesystem>
#include <stdexcept>

namespace quarn {
namespace {

bool isNumbered(const std::string& name, const std::string& wanted) {
    return name.starts_with(wanted) &&
           std::all_of(name.begin() + static_cast<std::ptrdiff_t>(wanted.size()), name.end(),
                       [](unsigned char letter) { return std::isdigit(letter) != 0; });
}

// the nodes of things of the file, in the order of both: of their names, or of those with a number where another node
// had the name; null for what is not there
template <class Things>
std::vector<HObject> nodesOf(const Things& things, const std::vector<HObject>& nodes) {
    std::vector<std::string> names; // of nodes that are still to be had
    for (const HObject& node : nodes)
        names.push_back(nodeName(node));
    std::vector<HObject> found(things.size());
    for (const bool isExact : {true, false})
        for (std::size_t i = 0; i < things.size(); ++i) {
            const std::string wanted = usableName(things[i].name);
            const auto name = std::find_if(names.begin(), names.end(), [&](const std::string& each) {
                return isExact ? each == wanted : isNumbered(each, wanted);
            });
            if (!found[i].isNull() || name == names.end())
                continue;
            found[i] = nodes[static_cast<std::size_t>(name - names.begin())];
            name->clear();
        }
    return found;
}

std::vector<HPlug> morphWeights(const HObject& mesh, std::size_t targets) {
    HPlugArray destinations;
    std::vector<HPlug> weights;
    if (mesh.isNull() || targets == 0 || plugOf(mesh, "outMesh").destinations(destinations).error())
        return weights;
    for (const HPlug& plug : destinations)
        if (weights.empty() && nodeType(plug.node()) == "blendShape")
            for (std::size_t target = 0; target < targets; ++target)
                weights.push_back(plugOf(plug.node(), "weight[" + std::to_string(target) + "]"));
    return weights;
}

bool isMap(const CharacterMesh& mesh, const std::vector<std::int32_t>& map) {
    return std::equal(mesh.joinedOf.begin(), mesh.joinedOf.end(), map.begin(), map.end(),
                      [](std::uint32_t a, std::int32_t b) { return static_cast<std::int64_t>(a) == b; });
}

// the mesh of the file: of the node's name and its map, or the only one with that map
std::size_t meshOf(const Character& character, const std::vector<HObject>& nodes, const HObject& mesh,
                   const ClipSource& source) {
    std::vector<std::size_t> alike;
    for (std::size_t i = 0; i < character.meshes.size(); ++i) {
        if (!isMap(character.meshes[i], source.sceneVertexOf))
            continue;
        if (nodes[i] == mesh)
            return i;
        alike.push_back(i);
    }
    if (alike.size() != 1)
        throw std::runtime_error(source.path + " has " + (alike.empty() ? "no mesh" : "several meshes") +
                                 " with the vertices of " + nodeName(mesh) +
                                 (alike.empty() ? ": it has changed since it was imported" : ""));
    return alike.front();
}

void addNodes(const Character& character, const std::vector<HObject>& meshes, ClipSource& source) {
    const std::vector<HObject> joints = nodesOf(character.joints, nodesOfType("joint"));
    for (std::size_t i = 0; i < joints.size(); ++i)
        if (!joints[i].isNull() && character.joints[i].sourceNode >= 0)
            source.joints.push_back(
                {static_cast<std::size_t>(character.joints[i].sourceNode), plugOf(joints[i], "worldMatrix")});
    for (std::size_t i = 0; i < meshes.size(); ++i) {
        std::vector<HPlug> weights = morphWeights(meshes[i], character.meshes[i].morphTargets.size());
        if (!weights.empty())
            source.morphs.push_back({static_cast<std::size_t>(character.meshes[i].sourceNode), std::move(weights)});
    }
}

// the file may have become another one between two looks at it
void requireNodes(const ClipSource& source) {
    const JsonValue& nodes = listOf(source.file.document, "nodes");
    bool areThere = source.meshNode < nodes.Size() &&
                    member(nodes[static_cast<rapidjson::SizeType>(source.meshNode)], "mesh") != nullptr;
    for (const ClipSource::JointNode& joint : source.joints)
        areThere = areThere && joint.node < nodes.Size();
    for (const ClipSource::MorphNode& morphs : source.morphs)
        areThere = areThere && morphs.node < nodes.Size();
    if (!areThere)
        throw std::runtime_error(source.path + " changes while it is read");
}

GltfMesh readMesh(const ClipSource& source) {
    GltfBytes bytes(source.file.document, source.file.binary, [](const std::string& uri) -> std::string {
        throw std::runtime_error("its buffer \"" + uri + "\" is not there");
    });
    GltfMesh mesh(source.file.document, source.meshNode, bytes);
    if (mesh.vertexCount() != source.sceneVertexOf.size())
        throw std::runtime_error("its mesh has " + std::to_string(mesh.vertexCount()) +
                                 " vertices, and the scene knows " + std::to_string(source.sceneVertexOf.size()) +
                                 " of it");
    return mesh;
}

// what of the file is needed, before anything is played
void readGeometry(ClipSource& source) {
    try {
        source.nodes.emplace(source.file.document);
        source.mesh.emplace(readMesh(source));
    } catch (const std::runtime_error& error) {
        throw std::runtime_error(source.path + ": " + error.what());
    }
}

} // namespace

std::string sourceFile() {
    const std::vector<HObject> characters = nodesOfType("character");
    return characters.empty() ? "" : textOf(plugOf(characters.front(), "sourceFile"));
}

std::shared_ptr<ClipSource> findClipSource(const HObject& mesh, std::size_t vertexCount) {
    if (!hasSourceFile())
        throw std::runtime_error("the scene knows no file of a character: quarn import sets one");
    if (mesh.isNull())
        throw std::runtime_error("what is played begins with no mesh of a file");
    auto source = std::make_shared<ClipSource>();
    source->path = std::filesystem::absolute(sourceFile()).string();
    if (!isGltf(lowerEnding(source->path)))
        throw std::runtime_error(source->path + " is no glTF file");
    source->sceneVertexOf = readVertexMap(nodeName(mesh));
    for (const std::int32_t vertex : source->sceneVertexOf)
        if (vertex < 0 || static_cast<std::size_t>(vertex) >= vertexCount)
            throw std::runtime_error(vertexMapFile(nodeName(mesh)).string() + " does not fit " + nodeName(mesh) +
                                     ", which has " + std::to_string(vertexCount) + " vertices");
    const Character character = readCharacter(source->path);
    const std::vector<HObject> meshes = nodesOf(character.meshes, nodesOfType("mesh"));
    source->meshNode = static_cast<std::size_t>(character.meshes[meshOf(character, meshes, mesh, *source)].sourceNode);
    addNodes(character, meshes, *source);
    source->file = readSourceGltf(source->path);
    requireNodes(*source);
    readGeometry(*source);
    return source;
}

} // namespace quarn
