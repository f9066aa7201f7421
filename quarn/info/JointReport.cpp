// SPDX-License-Identifier: Apache-2.0
#include "quarn/info/JointReport.h"

#include "openquarn/HFnAttribute.h"
#include "quarn/console/numberText.h"
#include "quarn/scene/plugs.h"
#include "quarn/scene/skins.h"

#include <array>
#include <cmath>
#include <functional>
#include <map>

namespace quarn {
namespace {

constexpr double degreesPerRadian = 180.0 / 3.14159265358979323846;
using AxesByJoint = std::map<std::string, std::vector<JointReport::Axis>>;

std::string element(const std::string& array, unsigned index) {
    return array + "[" + std::to_string(index) + "]";
}

bool isAngle(const JointReport::Axis& axis) {
    return axis.name.starts_with("rotate") || axis.name.starts_with("jointOrient");
}

// as people read it: degrees, without the rounding of the way there
double shown(const JointReport::Axis& axis, double value) {
    return isAngle(axis) ? std::round(value * degreesPerRadian * 1e9) / 1e9 : value;
}

// what a collector collects of joints
void addAxes(const HObject& collector, AxesByJoint& axes) {
    for (const unsigned list : indicesOf(plugOf(collector, "inputList")))
        for (const unsigned value : indicesOf(plugOf(collector, element("inputList", list) + ".input"))) {
            const HPlug source = sourceOf(collector, element(element("inputList", list) + ".input", value));
            if (source.isNull() || nodeType(source.node()) != "joint")
                continue;
            const std::string limits = element(element("limitsList", list) + ".limits", value);
            axes[nodeName(source.node())].push_back({HFnAttribute(source.attribute()).name().asChar(),
                                                     numberOf(plugOf(collector, limits + ".minValue")),
                                                     numberOf(plugOf(collector, limits + ".maxValue")),
                                                     numberOf(plugOf(collector, limits + ".defaultValue"))});
        }
}

AxesByJoint posedAxes() {
    AxesByJoint axes;
    for (const HObject& warp : nodesOfType("neuralWarp"))
        if (const HPlug source = sourceOf(warp, "poseGenerator");
            !source.isNull() && nodeType(source.node()) == "controlCollector")
            addAxes(source.node(), axes);
    return axes;
}

std::string orderName(int order) {
    constexpr std::array<const char*, 6> names = {"xyz", "yzx", "zxy", "xzy", "yxz", "zyx"};
    return order >= 0 && order < 6 ? names[static_cast<std::size_t>(order)] : std::to_string(order);
}

std::string axisText(const JointReport::Axis& axis) {
    std::string text = axis.name + " " + numberText(shown(axis, axis.least)) + " to " +
                       numberText(shown(axis, axis.most)) + (isAngle(axis) ? " degrees" : "");
    return axis.rest == 0.0 ? text : text + ", default " + numberText(shown(axis, axis.rest));
}

std::string jointLine(const JointReport& joint) {
    std::string line = std::string(2 * joint.below, ' ') + joint.name + ": " + std::to_string(joint.vertices) +
                       (joint.vertices == 1 ? " vertex" : " vertices");
    if (joint.rotateOrder != "xyz")
        line += ", rotates in the order " + joint.rotateOrder;
    for (const JointReport::Axis& axis : joint.axes)
        line += "; " + axisText(axis);
    return line + "\n";
}

} // namespace

std::vector<JointReport> describeJoints() {
    const std::vector<SceneJoint> joints = sceneJoints();
    const std::vector<std::size_t> moved = movedVertices(sceneSkins(joints), joints.size());
    const AxesByJoint axes = posedAxes();
    std::vector<JointReport> reports;
    for (std::size_t i = 0; i < joints.size(); ++i) {
        JointReport report;
        report.name = joints[i].name;
        report.rotateOrder = orderName(wholeNumberOf(plugOf(joints[i].node, "rotateOrder")));
        report.vertices = moved[i];
        if (const auto posed = axes.find(report.name); posed != axes.end())
            report.axes = posed->second;
        if (joints[i].parent >= 0) {
            const JointReport& parent = reports[static_cast<std::size_t>(joints[i].parent)];
            report.parent = parent.name;
            report.below = parent.below + 1;
        }
        reports.push_back(std::move(report));
    }
    return reports;
}

std::string jointsText(const std::vector<JointReport>& joints) {
    std::string text = std::to_string(joints.size()) + (joints.size() == 1 ? " joint\n" : " joints\n");
    // each below its parent, where the list has parents before their children
    const std::function<void(const std::string&)> addBelow = [&](const std::string& parent) {
        for (const JointReport& joint : joints)
            if (joint.parent == parent) {
                text += jointLine(joint);
                addBelow(joint.name);
            }
    };
    addBelow({});
    return text;
}

void writeJoints(JsonWriter& json, const std::vector<JointReport>& joints) {
    json.Key("joints");
    json.StartArray();
    for (const JointReport& joint : joints) {
        json.StartObject();
        writeText(json, "name", joint.name);
        writeText(json, "parent", joint.parent);
        writeText(json, "rotateOrder", joint.rotateOrder);
        writeCount(json, "vertices", joint.vertices);
        json.Key("axes");
        json.StartObject();
        for (const JointReport::Axis& axis : joint.axes) {
            writeText(json, axis.name);
            json.StartObject();
            for (const auto& [key, value] :
                 {std::pair("least", axis.least), std::pair("most", axis.most), std::pair("default", axis.rest)}) {
                json.Key(key);
                json.Double(shown(axis, value));
            }
            json.EndObject();
        }
        json.EndObject();
        json.EndObject();
    }
    json.EndArray();
}

} // namespace quarn
