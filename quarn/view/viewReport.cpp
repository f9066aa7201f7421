// SPDX-License-Identifier: Apache-2.0
#include "quarn/view/viewReport.h"

#include "quarn/console/json.h"
#include "quarn/console/numberText.h"

namespace quarn {
namespace {

std::string sizeText(std::uint64_t bytes) {
    constexpr double kilobyte = 1e3, megabyte = 1e6;
    const auto size = static_cast<double>(bytes);
    return size < megabyte ? roughText(size / kilobyte) + " kB" : roughText(size / megabyte) + " MB";
}

std::string partsText(const ViewResult& result) {
    std::string text;
    for (const auto& [name, bytes] : result.parts)
        text += (text.empty() ? "" : ", ") + name + " " + sizeText(bytes);
    return text;
}

std::string errorsText(const ViewResult& result) {
    const auto& [before, after] = *result.errors;
    return "to the target: mean " + roughText(before.mean) + " mm before and " + roughText(after.mean) +
           " mm after the model, max " + roughText(before.largest) + " and " + roughText(after.largest) +
           " mm (frame " + std::to_string(result.frameNumbers[after.worstFrame]) + ", vertex " +
           std::to_string(after.worstVertex) + ")\n";
}

std::string proofText(const ViewResult& result) {
    const Farthest& farthest = result.facts.difference;
    std::string text = "to quarn play: " + roughText(farthest.distance) + " mm at most (frame " +
                       std::to_string(result.frameNumbers[farthest.frame]) + ", vertex " +
                       std::to_string(farthest.vertex) + "), with a limit of " + roughText(result.facts.limitMm) +
                       " mm";
    if (result.facts.basisErrorMm > 0.0)
        text += "; the packed basis is " + roughText(result.facts.basisErrorMm) + " mm of it at most";
    return text + "\n";
}

void writeNumber(JsonWriter& json, const char* key, double value) {
    json.Key(key);
    json.Double(value);
}

void writeErrors(JsonWriter& json, const char* key, const PageErrors& errors, const std::vector<int>& frames) {
    json.Key(key);
    json.StartObject();
    writeNumber(json, "meanMm", errors.mean);
    writeNumber(json, "maxMm", errors.largest);
    json.Key("worstFrame");
    json.Int(frames[errors.worstFrame]);
    writeCount(json, "worstVertex", errors.worstVertex);
    json.EndObject();
}

void writeParts(JsonWriter& json, const ViewResult& result) {
    json.Key("parts");
    json.StartObject();
    for (const auto& [name, bytes] : result.parts)
        writeCount(json, name.c_str(), bytes);
    json.EndObject();
}

void writeProof(JsonWriter& json, const ViewResult& result) {
    const PageFacts& facts = result.facts;
    json.Key("difference");
    json.StartObject();
    writeNumber(json, "largestMm", facts.difference.distance);
    writeNumber(json, "limitMm", facts.limitMm);
    json.Key("frame");
    json.Int(result.frameNumbers[facts.difference.frame]);
    writeCount(json, "vertex", facts.difference.vertex);
    json.EndObject();
    writeNumber(json, "basisErrorMm", facts.basisErrorMm);
}

} // namespace

std::string viewText(const ViewResult& result, const ViewPlan& plan) {
    std::string text = plan.output.string() + ": " + sizeText(result.bytes) + " (" + partsText(result) + ")\n";
    text += std::to_string(result.frames) + " frames of " + std::to_string(result.vertices) + " vertices, ";
    text += result.sliders > 0 ? std::to_string(result.sliders) + " sliders\n"
                               : "no sliders: " + result.facts.whyNoSliders + "\n";
    if (result.errors)
        text += errorsText(result);
    return text + proofText(result);
}

std::string viewJson(const ViewResult& result, const ViewPlan& plan) {
    rapidjson::StringBuffer buffer;
    JsonWriter json(buffer);
    json.SetIndent(' ', 1);
    json.StartObject();
    writeText(json, "file", plan.output.string());
    writeCount(json, "bytes", result.bytes);
    writeParts(json, result);
    writeCount(json, "frames", result.frames);
    writeCount(json, "vertices", result.vertices);
    writeCount(json, "sliders", result.sliders);
    writeText(json, "whyNoSliders", result.facts.whyNoSliders);
    writeText(json, "whyPoints", result.facts.whyPoints);
    writeProof(json, result);
    json.Key("errors");
    if (result.errors) {
        json.StartObject();
        writeErrors(json, "before", result.errors->first, result.frameNumbers);
        writeErrors(json, "after", result.errors->second, result.frameNumbers);
        json.EndObject();
    } else {
        json.Null();
    }
    json.EndObject();
    return std::string(buffer.GetString(), buffer.GetSize()) + "\n";
}

} // namespace quarn
