// SPDX-License-Identifier: Apache-2.0
#include "quarn/info/certificateTexts.h"

#include "quarn/console/numberText.h"
#include "quarn/info/LineList.h"

#include <optional>
#include <utility>
#include <vector>

namespace quarn {
namespace {

using neuralWarp::CertifiedErrors;
using neuralWarp::ErrorFigures;
using neuralWarp::ExpectedError;
using neuralWarp::ModelCertificate;

std::string figuresText(const ErrorFigures& figures) {
    return "off by " + roughText(figures.mean) + " mm in the mean, " + roughText(figures.p99) +
           " mm at the 99th percentile, " + roughText(figures.p9999) + " mm at the 99.99th, " + roughText(figures.max) +
           " mm at most";
}

void addErrors(LineList& lines, const CertifiedErrors& errors) {
    const bool isDrawn = errors.poses == "drawn";
    lines.add("on " + std::to_string(errors.frames) + (isDrawn ? " drawn poses" : " frames of a motion") + " (" +
              errors.heldOut + ") vertices are " + figuresText(errors.network));
    const std::pair<const char*, const std::optional<ErrorFigures>&> others[] = {
        {"the skin alone is ", errors.skin},
        {"with deltas of zero they are ", errors.zeroDeltas},
        {"the best that its principal shapes could do is ", errors.basis}};
    for (const auto& [what, figures] : others)
        if (figures)
            lines.add("  " + std::string(what) + figuresText(*figures));
}

bool hasMotion(const ModelCertificate& certificate) {
    for (const CertifiedErrors& errors : certificate.errors)
        if (errors.poses == "motion")
            return true;
    return false;
}

std::string expectedText(const ExpectedError& expected) {
    return "expected error, by the distance from the trained poses: " + roughText(expected.millimetres().front()) +
           " mm up to " + roughText(expected.distances().front()) + ", " + roughText(expected.millimetres().back()) +
           " mm at " + roughText(expected.measuredTo()) + ", and nothing was measured beyond";
}

void writeNumber(JsonWriter& json, const char* key, double value) {
    json.Key(key);
    json.Double(value);
}

void writeFigures(JsonWriter& json, const char* key, const std::optional<ErrorFigures>& figures) {
    json.Key(key);
    if (!figures)
        return static_cast<void>(json.Null());
    json.StartObject();
    writeNumber(json, "mean", figures->mean);
    writeNumber(json, "p99", figures->p99);
    writeNumber(json, "p9999", figures->p9999);
    writeNumber(json, "max", figures->max);
    json.EndObject();
}

void writeErrors(JsonWriter& json, const std::vector<CertifiedErrors>& all) {
    json.Key("errors");
    json.StartArray();
    for (const CertifiedErrors& errors : all) {
        json.StartObject();
        writeCount(json, "frames", errors.frames);
        writeText(json, "poses", errors.poses);
        writeText(json, "heldOut", errors.heldOut);
        json.Key("mm");
        json.StartObject();
        writeFigures(json, "network", errors.network);
        writeFigures(json, "skin", errors.skin);
        writeFigures(json, "zeroDeltas", errors.zeroDeltas);
        writeFigures(json, "basis", errors.basis);
        json.EndObject();
        json.EndObject();
    }
    json.EndArray();
}

void writeControls(JsonWriter& json, const ModelCertificate& certificate) {
    json.Key("controls");
    json.StartArray();
    for (std::size_t i = 0; i < certificate.ranges.count(); ++i) {
        json.StartObject();
        writeText(json, "name", certificate.controlNames[i]);
        writeNumber(json, "minimum", certificate.ranges.minimum(i));
        writeNumber(json, "maximum", certificate.ranges.maximum(i));
        json.EndObject();
    }
    json.EndArray();
}

void writeNumbers(JsonWriter& json, const char* key, const std::vector<double>& numbers) {
    json.Key(key);
    json.StartArray();
    for (const double number : numbers)
        json.Double(number);
    json.EndArray();
}

void writeExpected(JsonWriter& json, const ExpectedError& expected) {
    json.Key("expectedError");
    if (expected.isEmpty())
        return static_cast<void>(json.Null());
    json.StartObject();
    writeNumbers(json, "distances", expected.distances());
    writeNumbers(json, "millimetres", expected.millimetres());
    json.EndObject();
}

} // namespace

std::string certificateText(const ModelKnowledge& knowledge) {
    LineList lines("lines of the certificate");
    if (const auto& certificate = knowledge.certificate) {
        lines.add("trained on " + std::to_string(certificate->trainingFrames) + " frames, in known ranges of " +
                  std::to_string(certificate->ranges.count()) + " controls");
        for (const CertifiedErrors& errors : certificate->errors)
            addErrors(lines, errors);
        if (!certificate->errors.empty() && !hasMotion(*certificate))
            lines.add(
                "  animation may be worse than drawn poses, on the demo's hand three times at the 99.99th percentile");
        if (!certificate->expected.isEmpty())
            lines.add(expectedText(certificate->expected));
        if (!knowledge.poses.isEmpty())
            lines.add(std::to_string(knowledge.poses.count()) + " trained poses are kept to measure distances from");
        for (const auto& [what, digest] :
             {std::pair("mesh ", certificate->mesh), std::pair("data set ", certificate->dataSet)})
            if (!digest.empty())
                lines.add(what + digest);
    }
    return lines.text() + (knowledge.why.empty() ? "" : "note: " + knowledge.why + "\n");
}

void writeCertificate(JsonWriter& json, const ModelKnowledge& knowledge) {
    writeText(json, "certificateNote", knowledge.why);
    json.Key("certificate");
    if (!knowledge.certificate)
        return static_cast<void>(json.Null());
    const ModelCertificate& certificate = *knowledge.certificate;
    json.StartObject();
    writeCount(json, "trainingFrames", certificate.trainingFrames);
    writeControls(json, certificate);
    writeErrors(json, certificate.errors);
    writeExpected(json, certificate.expected);
    writeCount(json, "trainedPoses", knowledge.poses.count());
    writeText(json, "mesh", certificate.mesh);
    writeText(json, "dataSet", certificate.dataSet);
    json.EndObject();
}

} // namespace quarn
