// SPDX-License-Identifier: Apache-2.0
#include "quarn/run/reportRows.h"

#include "quarn/console/json.h"

namespace quarn {
namespace {

void writeRow(JsonWriter& writer, const std::string& mesh) {
    const std::string data = "data/" + mesh + "/";
    writer.StartObject();
    writeText(writer, "mesh", mesh);
    writeText(writer, "set", data + "set");
    writeText(writer, "heldOut", data + "heldOut");
    writeText(writer, "training", data + "training");
    writeText(writer, "evaluate", answerFile("evaluate", mesh).string());
    writeText(writer, "skin", data + "heldOut_skin.npy");
    writeText(writer, "target", data + "heldOut_target.npy");
    for (const auto& [evaluator, step] : {std::pair("cpu", "play"), std::pair("gpu", "play-gpu")}) {
        writer.Key(evaluator);
        writer.StartObject();
        writeText(writer, "answer", answerFile(step, mesh).string());
        writeText(writer, "points", data + "heldOut_" + evaluator + ".npy");
        writer.EndObject();
    }
    writer.EndObject();
}

void writePictures(JsonWriter& writer, const ReportRows& rows) {
    writer.Key("pictures");
    writer.StartArray();
    for (const ReportRows::Picture& picture : rows.pictures) {
        writer.StartObject();
        writeText(writer, "file", picture.file.string());
        writeText(writer, "caption", picture.caption);
        writer.EndObject();
    }
    writer.EndArray();
    writer.Key("preview");
    writer.StartArray();
    for (const std::filesystem::path& file : rows.preview)
        writeText(writer, file.string());
    writer.EndArray();
}

} // namespace

std::string textOf(const ReportRows& rows) {
    rapidjson::StringBuffer buffer;
    JsonWriter writer(buffer);
    writer.StartObject();
    writeText(writer, "format", "neuralWarp report rows");
    writeCount(writer, "version", 1);
    writeText(writer, "title", rows.title);
    writeBool(writer, "isMotion", rows.isMotion);
    writer.Key("firstFrame");
    writer.Int(rows.firstFrame);
    writer.Key("rows");
    writer.StartArray();
    for (const std::string& mesh : rows.meshes)
        writeRow(writer, mesh);
    writer.EndArray();
    writePictures(writer, rows);
    writer.EndObject();
    return std::string(buffer.GetString()) + "\n";
}

} // namespace quarn
