// SPDX-License-Identifier: Apache-2.0
#include "quarn/scene/skins.h"

#include "openquarn/HFnAttribute.h"
#include "openquarn/HFnData.h"
#include "quarn/scene/Warp.h"
#include "quarn/scene/plugs.h"

#include <stdexcept>
#include <utility>

namespace quarn {
namespace {

std::string element(const char* array, std::size_t index) {
    return std::string(array) + "[" + std::to_string(index) + "]";
}

std::vector<double> listOf(const HObject& node, const std::string& path) {
    return HFnDoubleArrayData(plugOf(node, path).asHObject()).values();
}

rig::SkinWeights weightsOf(const HObject& node, unsigned geometry) {
    const std::string list = element("skin", geometry);
    const std::vector<double> counts = listOf(node, list + ".influenceCounts");
    const std::vector<double> influences = listOf(node, list + ".influences");
    const std::vector<double> weights = listOf(node, list + ".skinWeights");
    rig::SkinWeights skin;
    const bool normalize = numberOf(plugOf(node, "normalize")) != 0.0;
    if (const HStatus status = rig::makeSkinWeights({counts, influences, weights}, normalize, skin); status.error())
        throw std::runtime_error(nodeName(node) + "." + list + ": " + status.errorString().asChar());
    return skin;
}

SceneSkin::Influence influenceOf(const HObject& node, unsigned index, const std::vector<SceneJoint>& joints) {
    SceneSkin::Influence influence;
    const HPlug source = sourceOf(node, element("matrix", index));
    const bool isWorld =
        !source.isNull() && std::string(HFnAttribute(source.attribute()).name().asChar()) == "worldMatrix";
    if (isWorld)
        influence.joint = indexOfJoint(joints, source.node());
    influence.inverseBind = plugOf(node, element("bindPreMatrix", index)).asMatrix();
    return influence;
}

void addSkin(const HObject& node, unsigned geometry, const std::vector<SceneJoint>& joints,
             std::vector<SceneSkin>& skins) {
    SceneSkin skin;
    skin.input = plugOf(node, element("input", geometry) + ".inputGeometry");
    const HPlug source = skin.input.source();
    skin.weights = weightsOf(node, geometry);
    if (source.isNull() || skin.weights.vertexCount() == 0)
        return;
    skin.node = nodeName(node);
    const HObject mesh = meshBehind(source);
    skin.isMoved = mesh != source.node();
    skin.mesh = nodeName(mesh.isNull() ? source.node() : mesh);
    for (const std::uint32_t index : skin.weights.joints)
        skin.influences.push_back(influenceOf(node, index, joints));
    skins.push_back(std::move(skin));
}

} // namespace

std::vector<SceneSkin> sceneSkins(const std::vector<SceneJoint>& joints) {
    std::vector<SceneSkin> skins;
    for (const HObject& node : nodesOfType("skinCluster"))
        for (const unsigned geometry : indicesOf(plugOf(node, "input")))
            addSkin(node, geometry, joints, skins);
    return skins;
}

std::vector<std::size_t> movedVertices(const std::vector<SceneSkin>& skins, std::size_t jointCount) {
    std::vector<std::size_t> moved(jointCount, 0);
    for (const SceneSkin& skin : skins) {
        std::vector<std::size_t> counted(jointCount, 0); // the vertex, from 1, that was counted last
        for (std::size_t vertex = 0; vertex < skin.weights.vertexCount(); ++vertex)
            for (std::size_t i = skin.weights.first[vertex]; i < skin.weights.first[vertex + 1]; ++i) {
                const auto joint = skin.influences[skin.weights.influences[i].joint].joint;
                if (joint && std::exchange(counted[*joint], vertex + 1) != vertex + 1)
                    ++moved[*joint];
            }
    }
    return moved;
}

} // namespace quarn
