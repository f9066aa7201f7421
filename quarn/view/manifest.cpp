// SPDX-License-Identifier: Apache-2.0
#include "quarn/view/PageFacts.h"

#include "frame/DeltaSettings.h"
#include "quarn/console/json.h"
#include "quarn/console/printable.h"
#include "storage/Fnv64.h"

namespace quarn {
namespace {

void writeNumber(JsonWriter& json, const char* key, double value) {
    json.Key(key);
    json.Double(value);
}

void writeModel(JsonWriter& json, const PageModel& model) {
    const neuralWarp::DeltaSettings settings = model.model->settings();
    json.Key("model");
    json.StartObject();
    writeText(json, "name", model.name);
    writeText(json, "deltaMode", settings.isSurface() ? "surface" : "offset");
    json.Key("smoothingIterations");
    json.Int64(settings.smoothingIterations);
    writeCount(json, "shapes", model.shapes);
    writeCount(json, "controls", model.model->controlCount());
    writeCount(json, "vertices", model.slots);
    writeCount(json, "networkBytes", model.networkBytes);
    if (!model.trainer.empty())
        writeText(json, "trainer", model.trainer);
    if (model.seed)
        writeCount(json, "seed", *model.seed);
    json.EndObject();
}

void writeBasis(JsonWriter& json, const PageModel& model, double error) {
    constexpr const char* kinds[] = {"f32", "i16", "i8"};
    json.Key("basis");
    if (model.shapes == 0)
        json.Null();
    else
        json.String(kinds[static_cast<std::size_t>(model.basis.kind)]);
    writeNumber(json, "basisErrorMm", error);
}

void writeSliders(JsonWriter& json, const PageContent& content, const PageFacts& facts) {
    json.Key("sliders");
    json.StartArray();
    if (content.rig)
        for (const RigChain::Slider& slider : content.rig->sliders) {
            json.StartObject();
            writeText(json, "name", slider.name);
            writeText(json, "group", slider.group);
            writeNumber(json, "least", slider.limits.least);
            writeNumber(json, "most", slider.limits.most);
            writeNumber(json, "rest", slider.limits.rest);
            writeBool(json, "isAngle", slider.isAngle);
            json.EndObject();
        }
    json.EndArray();
    writeText(json, "whyNoSliders", facts.whyNoSliders);
    if (content.rig)
        writeNumber(json, "slidersDifferenceMm", facts.slidersMm);
}

void writeErrors(JsonWriter& json, const char* key, const PageErrors& errors) {
    json.Key(key);
    json.StartObject();
    writeNumber(json, "meanMm", errors.mean);
    writeNumber(json, "maxMm", errors.largest);
    writeCount(json, "worstFrame", errors.worstFrame);
    writeCount(json, "worstVertex", errors.worstVertex);
    json.EndObject();
}

void writeFrameErrors(JsonWriter& json, const char* key, const PageErrors& errors) {
    json.Key(key);
    json.StartArray();
    for (const PageErrors::OfFrame& frame : errors.frames) {
        json.StartObject();
        writeNumber(json, "mean", frame.mean);
        writeNumber(json, "max", frame.largest);
        json.EndObject();
    }
    json.EndArray();
}

void writeTarget(JsonWriter& json, const PageTarget& target, double mmPerUnit) {
    constexpr const char* kinds[] = {"points", "errors", "none"};
    writeBool(json, "hasTarget", target.kind == TargetKind::points);
    writeText(json, "target", kinds[static_cast<std::size_t>(target.kind)]);
    constexpr double halfSteps = 2.0 * 255.0;
    const double error = target.kind == TargetKind::errors ? target.range / halfSteps : target.points.error * mmPerUnit;
    writeNumber(json, "targetErrorMm", error);
    json.Key("errors");
    if (!target.skin) {
        json.Null();
        json.Key("frameErrors");
        json.Null();
        return;
    }
    json.StartObject();
    writeNumber(json, "rangeMm", target.skin->usual > 0.0 ? target.skin->usual : target.neural->largest);
    writeErrors(json, "before", *target.skin);
    writeErrors(json, "after", *target.neural);
    json.EndObject();
    json.Key("frameErrors");
    json.StartObject();
    writeFrameErrors(json, "before", *target.skin);
    writeFrameErrors(json, "after", *target.neural);
    json.EndObject();
}

void writeProof(JsonWriter& json, const PageFacts& facts) {
    json.Key("difference");
    json.StartObject();
    writeNumber(json, "largestMm", facts.difference.distance);
    writeNumber(json, "limitMm", facts.limitMm);
    writeCount(json, "frame", facts.difference.frame);
    writeCount(json, "vertex", facts.difference.vertex);
    json.EndObject();
}

void writeView(JsonWriter& json, const PageView& view) {
    json.Key("view");
    json.StartObject();
    writeNumber(json, "azimuth", view.azimuth);
    writeNumber(json, "elevation", view.elevation);
    writeText(json, "up", view.up);
    json.EndObject();
}

void writeMaterial(JsonWriter& json, const PageMaterial& material) {
    json.StartObject();
    writeCount(json, "firstTriangle", material.firstTriangle);
    writeCount(json, "triangles", material.triangles);
    json.Key("texture");
    json.Int(material.texture);
    json.Key("colour");
    json.StartArray();
    for (const float channel : material.colour)
        json.Double(static_cast<double>(channel));
    json.EndArray();
    writeBool(json, "isCutOut", material.isCutOut);
    json.EndObject();
}

void writeTextures(JsonWriter& json, const PageTextures& textures) {
    json.Key("materials");
    json.StartArray();
    for (const PageMaterial& material : textures.materials)
        writeMaterial(json, material);
    json.EndArray();
    json.Key("textures");
    json.StartArray();
    for (std::size_t i = 0; i < textures.textures.size(); ++i) {
        json.StartObject();
        writeText(json, "mime", textures.textures[i].mime);
        writeText(json, "block", "texture." + std::to_string(i));
        writeCount(json, "width", textures.textures[i].width);
        writeCount(json, "height", textures.textures[i].height);
        json.EndObject();
    }
    json.EndArray();
}

void writeBlocks(JsonWriter& json, const PageBlocks& blocks) {
    json.Key("blocks");
    json.StartArray();
    for (const PageBlock& block : blocks.all()) {
        storage::Fnv64 sum;
        sum.add(block.bytes);
        json.StartObject();
        writeText(json, "name", block.name);
        writeText(json, "type", block.type);
        writeCount(json, "count", block.count);
        writeCount(json, "bytes", block.bytes.size());
        writeText(json, "sum", sum.text());
        json.EndObject();
    }
    json.EndArray();
}

// "<" is only in texts
std::string withoutAngles(const std::string& json) {
    std::string safe;
    safe.reserve(json.size());
    for (const char letter : json)
        letter == '<' ? safe += "\\u003c" : safe += letter;
    return safe;
}

} // namespace

std::string manifestOf(const PageContent& content, const PageFacts& facts, const PageBlocks& blocks) {
    rapidjson::StringBuffer buffer;
    JsonWriter json(buffer);
    json.SetIndent(' ', 0);
    json.SetFormatOptions(rapidjson::kFormatSingleLineArray);
    json.StartObject();
    writeText(json, "format", "neuralWarp page");
    writeCount(json, "version", 1);
    writeText(json, "quarn", QUARN_VERSION);
    writeText(json, "title", facts.title);
    writeText(json, "mesh", facts.mesh);
    writeText(json, "scene", facts.scene);
    writeNumber(json, "mmPerUnit", content.mmPerUnit);
    writeNumber(json, "diagonalMm", facts.diagonalMm);
    json.Key("frames");
    json.StartArray();
    for (const int frame : content.frames.numbers)
        json.Int(frame);
    json.EndArray();
    writeNumber(json, "framesPerSecond", facts.framesPerSecond);
    writeModel(json, content.model);
    writeBasis(json, content.model, facts.basisErrorMm);
    writeSliders(json, content, facts);
    writeText(json, "whyPoints", facts.whyPoints);
    writeTarget(json, content.target, content.mmPerUnit);
    writeProof(json, facts);
    writeView(json, facts.view);
    writeTextures(json, content.textures);
    writeBlocks(json, blocks);
    json.EndObject();
    return withoutAngles(printable({buffer.GetString(), buffer.GetSize()}));
}

} // namespace quarn
