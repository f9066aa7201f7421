// SPDX-License-Identifier: Apache-2.0
#include "quarn/import/warpSetup.h"

#include "quarn/scene/plugs.h"
#include "quarn/scene/training.h"

#include <array>

namespace quarn {
namespace {

// the numbers of matrixConverter's rotationConversion
double conversionOf(const std::string& controls) {
    return controls == "euler" ? 0.0 : controls == "quaternion" ? 1.0 : 2.0;
}

HObject makeAxes(const std::string& controls) {
    if (controls == "ortho")
        return createNode("orthoAxisFromMatrixArray", "axes");
    HObject axes = createNode("matrixConverter", "axes");
    setNumber(plugOf(axes, "extractScale"), 0.0);
    setNumber(plugOf(axes, "extractTranslation"), 0.0);
    setNumber(plugOf(axes, "rotationConversion"), conversionOf(controls));
    return axes;
}

void addGeometry(const WarpNodes& nodes, const WarpSettings& settings, const SceneMesh& mesh, unsigned index) {
    const auto plug = [&](const std::string& array, const std::string& child) {
        return plugOf(nodes.warp, array + "[" + std::to_string(index) + "]" + child);
    };
    connect(plugOf(mesh.mover(), "outputGeom[0]"), plug("input", ".inputGeometry"));
    connect(plugOf(mesh.mesh, "outMesh"), plug("originalGeometry", ""));
    const std::string name = nodeName(mesh.mesh);
    setText(plug("models", ".modelName"), name);
    setText(plug("export", ".trainingDataName"), name);
    setText(plug("train", ".outputModelName"), name);
    setNumber(plug("export", ".deltaMode"), settings.deltaMode == "offset" ? 0.0 : 1.0);
    if (settings.smoothing)
        setNumber(plug("export", ".smoothingIterations"), *settings.smoothing);
    setGoodTraining(plug("train", ""));
}

void addPoses(const HObject& poses, const PosedJoint& posed, const HObject& joint, const std::string& list) {
    constexpr std::array<const char*, 3> angles = {"rotateX", "rotateY", "rotateZ"};
    unsigned next = 0;
    for (std::size_t axis = 0; axis < angles.size(); ++axis) {
        if (!posed.limits.at(axis))
            continue;
        const std::string value = "[" + std::to_string(next++) + "]";
        connect(plugOf(joint, angles.at(axis)), plugOf(poses, "inputList" + list + ".input" + value));
        const std::string limits = "limitsList" + list + ".limits" + value;
        setNumber(plugOf(poses, limits + ".minValue"), posed.limits.at(axis)->first);
        setNumber(plugOf(poses, limits + ".maxValue"), posed.limits.at(axis)->second);
        setNumber(plugOf(poses, limits + ".defaultValue"), 0.0);
    }
}

void addJoint(const WarpNodes& nodes, const PosedJoint& posed, const HObject& joint, const std::string& list) {
    connect(plugOf(joint, "relativeMatrix"), plugOf(nodes.axes, "input" + list));
    connect(plugOf(nodes.axes, "outputList" + list + ".output"), plugOf(nodes.controls, "inputList" + list + ".input"));
    addPoses(nodes.poses, posed, joint, list);
}

// its own limits are those that are sampled: the collector has none for it
void setLimits(const HObject& node, const PosedSlider& slider) {
    const std::string plug = "slider[" + std::to_string(slider.target) + "].";
    setNumber(plugOf(node, plug + "minValue"), slider.limits.first);
    setNumber(plugOf(node, plug + "maxValue"), slider.limits.second);
}

// the sliders of a mesh, as a list behind those of joints
void addSliders(const WarpNodes& nodes, const PosedSliders& posed, std::size_t mesh, const HObject& node,
                const std::string& list) {
    unsigned next = 0;
    for (const PosedSlider& slider : posed.sliders) {
        if (slider.mesh != mesh)
            continue;
        setLimits(node, slider);
        const std::string value = "inputList" + list + ".input[" + std::to_string(next++) + "]";
        for (const HObject& collector : {nodes.poses, nodes.controls})
            connect(plugOf(node, "output[" + std::to_string(slider.target) + "]"), plugOf(collector, value));
    }
}

} // namespace

WarpNodes makeWarpNodes(const WarpSettings& settings, bool hasJoints) {
    WarpNodes nodes;
    nodes.warp = createNode("neuralWarp", "warp");
    nodes.poses = createNode("controlCollector", "poses");
    if (hasJoints)
        nodes.axes = makeAxes(settings.controls);
    nodes.controls = createNode("controlCollector", "controls");
    return nodes;
}

bool isDeformed(const CharacterScene& scene, std::size_t mesh, const PosedSliders& sliders) {
    return !scene.meshes[mesh].skin.isNull() || sliders.isOf(mesh);
}

void connectWarp(const WarpNodes& nodes, const WarpSettings& settings, const std::vector<PosedJoint>& joints,
                 const PosedSliders& sliders, const CharacterScene& scene) {
    unsigned geometries = 0;
    for (std::size_t mesh = 0; mesh < scene.meshes.size(); ++mesh)
        if (isDeformed(scene, mesh, sliders))
            addGeometry(nodes, settings, scene.meshes[mesh], geometries++);
    setText(plugOf(nodes.warp, "modelRoot"), settings.modelRoot);
    setText(plugOf(nodes.warp, "trainingDataRoot"), "data");
    std::size_t lists = 0;
    const auto nextList = [&] { return "[" + std::to_string(lists++) + "]"; };
    for (const PosedJoint& joint : joints)
        addJoint(nodes, joint, scene.joints[joint.joint], nextList());
    for (std::size_t mesh = 0; mesh < scene.meshes.size(); ++mesh)
        if (sliders.isOf(mesh))
            addSliders(nodes, sliders, mesh, scene.meshes[mesh].morphs.sliders, nextList());
    connect(plugOf(nodes.controls, "output"), plugOf(nodes.warp, "controlValues"));
    connect(plugOf(nodes.poses, "message"), plugOf(nodes.warp, "poseGenerator"));
    if (settings.lastFrame)
        setNumber(plugOf(nodes.warp, "exportEndFrame"), *settings.lastFrame);
    if (settings.samples)
        setNumber(plugOf(nodes.poses, "samples"), *settings.samples);
    if (settings.activationRate)
        setNumber(plugOf(nodes.poses, "activationRate"), *settings.activationRate);
}

} // namespace quarn
