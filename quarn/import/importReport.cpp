// SPDX-License-Identifier: Apache-2.0
#include "quarn/console/json.h"
#include "quarn/import/importCharacter.h"

#include <sstream>

namespace quarn {
namespace {

void writeNumber(JsonWriter& writer, const char* key, double value) {
    writer.Key(key);
    writer.Double(value);
}

template <class Items, class Write>
void writeList(JsonWriter& writer, const char* key, const Items& items, Write write) {
    writer.Key(key);
    writer.StartArray();
    for (const auto& item : items)
        write(item);
    writer.EndArray();
}

void writeMesh(JsonWriter& writer, const ImportReport::Mesh& mesh) {
    writer.StartObject();
    writeText(writer, "name", mesh.name);
    writeText(writer, "node", mesh.node);
    writeText(writer, "skin", mesh.skin);
    writeCount(writer, "fileVertices", mesh.fileVertices);
    writeText(writer, "fileOrder", mesh.fileOrder);
    writeCount(writer, "vertices", mesh.vertices);
    writeCount(writer, "polygons", mesh.polygons);
    writeCount(writer, "joints", mesh.joints);
    writeCount(writer, "morphTargets", mesh.morphTargets);
    writeText(writer, "vertexMap", mesh.vertexMap);
    writer.EndObject();
}

void writeJoint(JsonWriter& writer, const ImportReport::Joint& joint) {
    writer.StartObject();
    writeText(writer, "name", joint.name);
    writeText(writer, "node", joint.node);
    writeBool(writer, "posed", joint.posed);
    writer.EndObject();
}

void writeAnimation(JsonWriter& writer, const ImportReport::Animation& animation) {
    writer.StartObject();
    writeText(writer, "name", animation.name);
    writeNumber(writer, "seconds", animation.seconds);
    writeBool(writer, "used", animation.used);
    if (animation.used) {
        writeCount(writer, "firstFrame", static_cast<std::uint64_t>(animation.firstFrame));
        writeCount(writer, "lastFrame", static_cast<std::uint64_t>(animation.lastFrame));
    }
    writer.EndObject();
}

std::string morphText(const ImportReport::Mesh& mesh) {
    return mesh.morphTargets == 0 ? "" : ", " + std::to_string(mesh.morphTargets) + " morph targets";
}

std::string posedText(const ImportReport& report) {
    const std::string angles = std::to_string(report.poseInputs) + " angles";
    const std::string weights = std::to_string(report.poseWeights) + " weights";
    if (report.poseInputs == 0)
        return report.poseWeights == 0 ? "" : weights;
    return report.poseWeights == 0 ? angles : angles + " and " + weights;
}

} // namespace

std::string reportText(const ImportReport& report) {
    std::ostringstream text;
    text.imbue(std::locale::classic());
    for (const ImportReport::Mesh& mesh : report.meshes)
        text << "mesh " << mesh.node << ": " << mesh.fileVertices << ' ' << mesh.fileOrder << " in the file, joined to "
             << mesh.vertices << "; " << mesh.polygons << " polygons, " << mesh.joints << " joints" << morphText(mesh)
             << '\n';
    text << "joints: " << report.joints.size() << '\n';
    for (const ImportReport::Animation& animation : report.animations) {
        text << "animation " << animation.name << ": " << animation.seconds << " s";
        if (animation.used)
            text << ", frames " << animation.firstFrame << " to " << animation.lastFrame;
        text << '\n';
    }
    if (report.curves > 0)
        text << "curves: " << report.curves << '\n';
    if (const std::string posed = posedText(report); !posed.empty())
        text << "deformer warp: " << posed << " to pose\n";
    text << "scene " << report.scene << '\n';
    return text.str();
}

std::string reportJson(const ImportReport& report) {
    rapidjson::StringBuffer buffer;
    JsonWriter writer(buffer);
    writer.StartObject();
    writeText(writer, "scene", report.scene);
    writeNumber(writer, "metersPerUnit", report.metersPerUnit);
    writeList(writer, "meshes", report.meshes, [&](const auto& mesh) { writeMesh(writer, mesh); });
    writeList(writer, "joints", report.joints, [&](const auto& joint) { writeJoint(writer, joint); });
    writeList(writer, "animations", report.animations,
              [&](const auto& animation) { writeAnimation(writer, animation); });
    writeCount(writer, "curves", report.curves);
    writeCount(writer, "poseInputs", report.poseInputs);
    writeCount(writer, "poseWeights", report.poseWeights);
    writeList(writer, "warnings", report.warnings, [&](const auto& text) { writeText(writer, text); });
    writeList(writer, "notes", report.notes, [&](const auto& text) { writeText(writer, text); });
    writer.EndObject();
    return std::string(buffer.GetString()) + '\n';
}

} // namespace quarn
