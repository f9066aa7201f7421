// SPDX-License-Identifier: Apache-2.0
#include "quarn/scene/poseTexts.h"

#include "quarn/console/Console.h"
#include "quarn/console/numberText.h"

#include <cmath>

namespace quarn {
namespace {

constexpr double inPercent = 100.0;
constexpr std::size_t mostControls = 10;

std::string framesText(std::size_t frames) {
    return std::to_string(frames) + (frames == 1 ? " frame" : " frames");
}

std::string controlLine(const OutsideControl& control) {
    return "  " + control.name + ": " + framesText(control.frames) + ", at most " +
           roughText(std::abs(control.excess)) + (control.excess < 0.0 ? " below" : " above") + " (" +
           (control.part ? roughText(*control.part * inPercent) + " % of its range"
                         : "it never moved in the training") +
           ") in frame " + std::to_string(control.frame) + "\n";
}

std::string outsideText(const PoseCounts& counts) {
    if (counts.outside == 0)
        return "all " + framesText(counts.frames) + " lie in the ranges that it was trained in\n";
    std::string text = std::to_string(counts.outside) + " of " + framesText(counts.frames) +
                       " lie outside of the ranges that it was trained in\n";
    for (std::size_t i = 0; i < counts.controls.size() && i < mostControls; ++i)
        text += controlLine(counts.controls[i]);
    if (counts.controls.size() > mostControls)
        text += "  and " + std::to_string(counts.controls.size() - mostControls) + " more controls\n";
    return text;
}

std::string expectedText(const ExpectedErrors& expected) {
    std::string text = "expected error, in the mean of a frame's vertices: " + roughText(expected.mean) + " mm; worst";
    for (const FrameError& error : expected.worst)
        text += (&error == expected.worst.data() ? " " : ", ") + roughText(error.millimetres) + " mm in frame " +
                std::to_string(error.frame);
    return text + "\n" +
           (expected.beyond == 0 ? ""
                                 : "for " + framesText(expected.beyond) +
                                       ", which lie further out than what was measured, that is an estimate\n");
}

void number(JsonWriter& json, const char* key, double value) {
    json.Key(key);
    if (std::isfinite(value))
        json.Double(value);
    else
        json.Null(); // of a control that is no number
}

void writeControl(JsonWriter& json, const OutsideControl& control) {
    json.StartObject();
    writeText(json, "name", control.name);
    writeCount(json, "frames", control.frames);
    number(json, "excess", control.excess);
    json.Key("partOfRange");
    if (control.part && std::isfinite(*control.part))
        json.Double(*control.part);
    else
        json.Null();
    json.Key("worstFrame");
    json.Int(control.frame);
    json.EndObject();
}

void writeExpected(JsonWriter& json, const ExpectedErrors& expected) {
    json.StartObject();
    number(json, "meanMm", expected.mean);
    writeCount(json, "framesBeyondMeasured", expected.beyond);
    json.Key("worst");
    json.StartArray();
    for (const FrameError& error : expected.worst) {
        json.StartObject();
        json.Key("frame");
        json.Int(error.frame);
        number(json, "mm", error.millimetres);
        json.EndObject();
    }
    json.EndArray();
    json.EndObject();
}

void writeReport(JsonWriter& json, const PoseReport& report) {
    const PoseCounts& counts = report.counts;
    json.StartObject();
    writeText(json, "deformer", report.deformer);
    writeText(json, "geometry", report.geometry);
    writeText(json, "model", report.model);
    writeBool(json, "certificate", report.hasCertificate);
    writeText(json, "why", report.why);
    writeCount(json, "frames", counts.frames);
    writeCount(json, "framesOutside", counts.outside);
    number(json, "largestDistance", counts.distance);
    json.Key("controlsOutside");
    json.StartArray();
    for (const OutsideControl& control : counts.controls)
        writeControl(json, control);
    json.EndArray();
    json.Key("expectedError");
    if (counts.expected)
        writeExpected(json, *counts.expected);
    else
        json.Null();
    json.EndObject();
}

} // namespace

std::string posesText(const std::vector<PoseReport>& reports) {
    std::string text;
    for (const PoseReport& report : reports) {
        const std::string model = report.deformer + ", " + report.geometry + ", model " + report.model + ": ";
        if (report.hasCertificate)
            text += model + outsideText(report.counts);
        if (!report.why.empty())
            text += model + report.why + "\n";
        if (report.counts.expected)
            text += expectedText(*report.counts.expected);
    }
    return text;
}

void notePoses(const Console& console, const std::vector<PoseReport>& reports) {
    if (const std::string text = posesText(reports); !text.empty())
        console.note(text.substr(0, text.size() - 1));
}

void writePoses(JsonWriter& json, const std::vector<PoseReport>& reports) {
    json.Key("poses");
    json.StartArray();
    for (const PoseReport& report : reports)
        writeReport(json, report);
    json.EndArray();
}

} // namespace quarn
