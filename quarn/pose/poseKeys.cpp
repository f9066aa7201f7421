// SPDX-License-Identifier: Apache-2.0
#include "quarn/pose/poseKeys.h"

#include "openquarn/HDGModifier.h"
#include "openquarn/HFnData.h"
#include "openquarn/HFnDependencyNode.h"
#include "openquarn/HMatrix.h"
#include "openquarn/HTransformationMatrix.h"
#include "quarn/scene/PoseControls.h"
#include "quarn/scene/plugs.h"

#include <algorithm>
#include <cctype>
#include <cmath>
#include <initializer_list>
#include <stdexcept>

namespace quarn {
namespace {

constexpr const char* sampledEnding = "_pose";
constexpr const char* motionEnding = "_keys";

// the next `quarn pose` knows its curves by this name (decisions 0074 and 0171)
std::string curveName(const HPlug& plug, const char* ending) {
    std::string name = writtenName(plug);
    for (char& letter : name)
        if (std::isalnum(static_cast<unsigned char>(letter)) == 0)
            letter = '_';
    return name + ending;
}

HPlugArray destinationsOf(const HPlug& plug) {
    HPlugArray destinations;
    if (const HStatus status = plug.destinations(destinations); status.error())
        throw std::runtime_error(std::string(plug.name().asChar()) + ": " + status.errorString().asChar());
    return destinations;
}

bool drivesSomething(const HObject& node) {
    HPlugArray plugs;
    return !HFnDependencyNode(node).getConnections(plugs).error() &&
           std::any_of(plugs.begin(), plugs.end(), [](const HPlug& plug) { return plug.isSource(); });
}

double firstKey(const HObject& curve) {
    const std::vector<double> values = HFnDoubleArrayData(plugOf(curve, "keyValues").asHObject()).values();
    return values.empty() ? 0.0 : values.front();
}

void deleteNode(const HObject& node) {
    const std::string name = nodeName(node);
    HDGModifier change;
    HStatus status = change.deleteNode(node);
    if (!status.error())
        status = change.doIt();
    if (status.error())
        throw std::runtime_error(name + " could not be deleted: " + status.errorString().asChar());
}

bool isCurveOf(const HObject& node, std::initializer_list<const char*> endings) {
    if (nodeType(node) != "animCurve")
        return false;
    const HPlugArray driven = destinationsOf(plugOf(node, "output"));
    if (driven.size() != 1)
        return false;
    // a name that was taken has a number behind it
    const std::string name = nodeName(node);
    const std::string taken = name.substr(0, name.find_last_not_of("0123456789") + 1);
    return std::any_of(endings.begin(), endings.end(),
                       [&](const char* ending) { return taken == curveName(driven.front(), ending); });
}

void removeCurve(const HObject& curve, const HPlug& driven) {
    const double value = firstKey(curve);
    deleteNode(curve);
    setNumber(driven, value);
}

// --- the rest pose of a joint ---

// what the angles of `rotate` are when matrix = restMatrix: the rotation of restMatrix is R * JO
HEulerRotation restRotation(const HObject& joint, const HTransformationMatrix& rest) {
    const HEulerRotation orient(numberOf(plugOf(joint, "jointOrientX")), numberOf(plugOf(joint, "jointOrientY")),
                                numberOf(plugOf(joint, "jointOrientZ")));
    const HMatrix turn = rest.asRotateMatrix() * orient.asMatrix().inverse();
    const auto order = static_cast<HEulerRotation::RotationOrder>(wholeNumberOf(plugOf(joint, "rotateOrder")));
    return HEulerRotation::fromMatrix(turn, order);
}

HVector restValues(const HObject& joint, const std::string& channel) {
    const HMatrix restMatrix = plugOf(joint, "restMatrix").asMatrix();
    if (restMatrix == HMatrix()) // nobody has said what the rest pose is
        return channel == "scale" ? HVector(1.0, 1.0, 1.0) : HVector();
    const HTransformationMatrix rest(restMatrix);
    if (channel == "translate")
        return rest.translation(HSpace::kTransform);
    double scale[3] = {1.0, 1.0, 1.0};
    rest.getScale(scale, HSpace::kTransform);
    if (channel == "scale")
        return {scale[0], scale[1], scale[2]};
    const HEulerRotation angles = restRotation(joint, rest);
    return {angles.x, angles.y, angles.z};
}

void goToRest(const HPlug& compound) {
    const HObject node = compound.node();
    const std::string channel = compound.partialName().asChar();
    if (nodeType(node) != "joint" || (channel != "translate" && channel != "rotate" && channel != "scale"))
        return;
    const HVector values = restValues(node, channel);
    constexpr double rounding = 1e-12;
    for (unsigned axis = 0; axis < 3; ++axis)
        if (const HPlug child = compound.child(axis); !child.isLocked() && !child.isDestination())
            setNumber(child, std::abs(values[axis]) < rounding ? 0.0 : values[axis]);
}

void release(const HPlug& plug) {
    for (HPlug place = plug; !place.isNull(); place = wholeOf(place)) {
        if (!place.isDestination())
            continue;
        const HObject source = place.source().node();
        if (place == plug && isPoseCurve(source)) {
            removeCurve(source, plug);
            continue;
        }
        disconnectSource(place);
        if (place != plug)
            goToRest(place);
    }
}

} // namespace

bool isPoseCurve(const HObject& node) {
    return isCurveOf(node, {sampledEnding, motionEnding});
}

bool isSampledCurve(const HObject& node) {
    return isCurveOf(node, {sampledEnding});
}

void holdAt(const HPlug& plug, double value) {
    release(plug);
    setNumber(plug, value);
}

void putPoseKeys(const HPlug& plug, const PoseKeys& keys) {
    holdAt(plug, keys.values.front());
    const HObject curve = createNode("animCurve", curveName(plug, keys.isMotion ? motionEnding : sampledEnding));
    setList(plugOf(curve, "keyTimes"), keys.times);
    setList(plugOf(curve, "keyValues"), keys.values);
    if (keys.kind == PoseKeys::Kind::spline) {
        setList(plugOf(curve, "keyInTangents"), keys.slopes);
        setList(plugOf(curve, "keyOutTangents"), keys.slopes);
    }
    setNumber(plugOf(curve, "interpolation"), static_cast<double>(keys.kind));
    if (keys.drawn > 0)
        setNumber(plugOf(curve, "drawnKeys"), static_cast<double>(keys.drawn));
    connect(findPlug("time1.outTime"), plugOf(curve, "time"));
    connect(plugOf(curve, "output"), plug);
}

void removePoseKeys() {
    for (const HObject& curve : nodesOfType("animCurve"))
        if (isPoseCurve(curve))
            removeCurve(curve, destinationsOf(plugOf(curve, "output")).front());
}

std::vector<HObject> drivingCurves() {
    std::vector<HObject> found;
    for (const char* type : {"animCurve", "animCurveQuaternion"})
        for (const HObject& curve : nodesOfType(type))
            if (drivesSomething(curve))
                found.push_back(curve);
    return found;
}

std::vector<HObject> animationCurves() {
    std::vector<HObject> curves = drivingCurves();
    curves.erase(std::remove_if(curves.begin(), curves.end(), isSampledCurve), curves.end());
    return curves;
}

} // namespace quarn
