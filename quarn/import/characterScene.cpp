// SPDX-License-Identifier: Apache-2.0
#include "quarn/import/characterScene.h"

#include "quarn/import/skinBinding.h"
#include "quarn/scene/meshes.h"
#include "quarn/scene/plugs.h"

#include <algorithm>

namespace quarn {
namespace {

// below this what is left out cannot be told from the rounding of single precision
constexpr double noticedShear = 1e-5;

void setVector(const HObject& node, const std::string& attribute, const HVector& value) {
    setNumber(plugOf(node, attribute + "X"), value.x);
    setNumber(plugOf(node, attribute + "Y"), value.y);
    setNumber(plugOf(node, attribute + "Z"), value.z);
}

HObject makeJoint(const std::string& name, const JointRest& rest) {
    HObject node = createNode("joint", name);
    const HEulerRotation orient = rest.orient.asEulerRotation();
    setVector(node, "translate", rest.translate);
    setVector(node, "jointOrient", {orient.x, orient.y, orient.z});
    setVector(node, "scale", rest.scale);
    // as the node itself rounds it: what has been done to the joint is nothing, to the last bit
    setMatrix(plugOf(node, "restMatrix"), plugOf(node, "matrix").asMatrix());
    return node;
}

void makeJoints(const Character& character, const std::vector<JointRest>& rests, CharacterScene& scene) {
    scene.joints.reserve(character.joints.size());
    for (std::size_t i = 0; i < character.joints.size(); ++i) {
        const Joint& joint = character.joints[i];
        const HObject node = makeJoint(joint.name, rests[i]);
        if (joint.parent >= 0)
            connect(plugOf(scene.joints[static_cast<std::size_t>(joint.parent)], "worldMatrix"),
                    plugOf(node, "parentMatrix"));
        // at rest the bind matrices have it (decision 0071)
        if (rests[i].shear > noticedShear)
            scene.notes.push_back("the joint \"" + joint.name +
                                  "\" is sheared in the file, which a joint of the scene cannot be: it is as in the "
                                  "file at rest, and in motion without the shear");
        scene.joints.push_back(node);
    }
}

// a mirroring transformation turns polygons inside out, unless they go round the other way
MeshPolygons polygonsOf(const CharacterMesh& mesh, bool mirrored) {
    MeshPolygons polygons{mesh.points.size(), mesh.polygonSizes, mesh.corners, mesh.uvs, mesh.cornerUvs};
    if (!mirrored)
        return polygons;
    for (std::vector<std::uint32_t>* corners : {&polygons.corners, &polygons.uvCorners}) {
        auto first = corners->begin();
        for (std::size_t i = 0; first != corners->end(); ++i) {
            std::reverse(first, first + polygons.sizes[i]);
            first += polygons.sizes[i];
        }
    }
    return polygons;
}

HObject makeMesh(const CharacterMesh& mesh, const HMatrix& toScene) {
    std::vector<double> xyz;
    xyz.reserve(3 * mesh.points.size());
    for (const HPoint& point : mesh.points) {
        const HPoint placed = point * toScene;
        xyz.insert(xyz.end(), {placed.x, placed.y, placed.z});
    }
    HObject node = createNode("mesh", mesh.name);
    HPlug inMesh = plugOf(node, "inMesh");
    const HStatus status = inMesh.setHObject(meshData(xyz, polygonsOf(mesh, toScene.det3x3() < 0.0)));
    if (status.error())
        throw std::runtime_error("mesh \"" + mesh.name + "\": " + status.errorString().asChar());
    return node;
}

HObject makeSkin(const SkinBinding& binding, const SceneMesh& made, const CharacterScene& scene) {
    HObject skin = createNode("skinCluster", nodeName(made.mesh) + "_skin");
    const bool morphs = !made.morphs.shapes.isNull();
    connect(morphs ? plugOf(made.morphs.shapes, "outputGeom[0]") : plugOf(made.mesh, "outMesh"),
            plugOf(skin, "input[0].inputGeometry"));
    for (std::size_t k = 0; k < binding.joints.size(); ++k) {
        const std::string element = "[" + std::to_string(k) + "]";
        connect(plugOf(scene.joints[binding.joints[k].joint], "worldMatrix"), plugOf(skin, "matrix" + element));
        setMatrix(plugOf(skin, "bindPreMatrix" + element), binding.joints[k].inverseBind);
    }
    setList(plugOf(skin, "skin[0].influenceCounts"), binding.counts);
    setList(plugOf(skin, "skin[0].influences"), binding.influences);
    setList(plugOf(skin, "skin[0].skinWeights"), binding.weights);
    return skin;
}

} // namespace

CharacterScene buildScene(const Character& character, const std::vector<JointRest>& rests) {
    CharacterScene scene;
    scene.character = createNode("character", "character");
    setNumber(plugOf(scene.character, "metersPerUnit"), character.metersPerUnit);
    makeJoints(character, rests, scene);
    const RestWorlds worlds{restWorlds(character), sceneWorlds(character, rests)};
    scene.meshes.reserve(character.meshes.size());
    for (const CharacterMesh& mesh : character.meshes) {
        const SkinBinding binding = bindMesh(mesh, worlds);
        SceneMesh made{makeMesh(mesh, binding.toScene), {}, {}};
        made.morphs = makeMorphs(mesh, made.mesh, binding.toScene);
        if (!binding.joints.empty())
            made.skin = makeSkin(binding, made, scene);
        if (binding.movedAtRest >= 0)
            scene.notes.push_back("the mesh \"" + mesh.name +
                                  "\" was bound in another pose than the rest pose of the file (joint \"" +
                                  character.joints[static_cast<std::size_t>(binding.movedAtRest)].name +
                                  "\"): its rest mesh is as it was bound, and its skin moves it at rest");
        scene.meshes.push_back(std::move(made));
    }
    return scene;
}

} // namespace quarn
