// SPDX-License-Identifier: Apache-2.0
#include "quarn/scene/EnvelopeGuard.h"

#include "nw_model/ModelCertificate.h"
#include "quarn/console/Console.h"
#include "quarn/scene/modelDirectory.h"
#include "quarn/scene/plugs.h"

#include <CLI/CLI.hpp>

#include <algorithm>
#include <filesystem>
#include <locale>
#include <sstream>
#include <stdexcept>

namespace quarn {
namespace {

namespace fs = std::filesystem;

neuralWarp::ControlRanges rangesOf(const fs::path& model) {
    const std::optional<neuralWarp::ModelCertificate> certificate =
        neuralWarp::readCertificate(model / "metadata.json");
    if (!certificate)
        throw std::runtime_error("the model " + model.string() +
                                 " does not say which poses it was trained on: --guard needs a model with a "
                                 "certificate, which the trainer writes");
    return certificate->ranges;
}

std::vector<float> controlsOf(const Warp& warp) {
    std::vector<float> controls;
    for (const double value : numbersOf(warp.plug("controlValues")))
        controls.push_back(static_cast<float>(value));
    return controls;
}

std::string sentenceOf(const GuardReport& report, double width) {
    std::ostringstream out;
    out.imbue(std::locale::classic());
    out.precision(3);
    out << "guard: the envelope of " << report.deformer << " is lowered in " << report.lowered << " of "
        << report.frames << " frames, and 0 in " << report.off;
    if (report.lowered > 0)
        out << "; frame " << report.frame << " is furthest beyond the ranges of the training, by " << report.distance
            << " of a range (the envelope is 0 from " << width << " on)";
    return out.str();
}

} // namespace

void addGuardOptions(CLI::App& command, GuardOption& option) {
    CLI::Option* guard =
        command.add_flag("--guard", option.isOn,
                         "Lower the deformer's envelope where controls leave the ranges of the model's training");
    command
        .add_option("--guard-width", option.width, "How far beyond, in parts of a control's range, the envelope is 0")
        ->check(CLI::Range(0.001, 1000.0))
        ->type_name("WIDTH")
        ->capture_default_str()
        ->needs(guard);
}

double envelopeLeft(double distance, double width) {
    const double part = std::min(distance / width, 1.0);
    const double left = 1.0 - part * part;
    return left * left;
}

EnvelopeGuard::EnvelopeGuard(const std::vector<AppliedModels::Geometry>& geometries, double width)
    : width_(width) {
    if (geometries.empty())
        throw std::runtime_error("--guard lowers the envelope of a neuralWarp deformer, and what is shown has none");
    for (const AppliedModels::Geometry& one : geometries)
        deformers_[one.warp.name].models.push_back({one, {}});
    for (auto& [name, deformer] : deformers_) {
        deformer.envelope = deformer.models.front().place.warp.plug("envelope");
        deformer.source = deformer.envelope.source();
        if (deformer.source.isNull())
            deformer.own = numberOf(deformer.envelope);
        else
            disconnectSource(deformer.envelope);
    }
}

void EnvelopeGuard::apply(int frame) {
    for (auto& [name, deformer] : deformers_)
        try {
            apply(deformer, frame);
        } catch (const std::runtime_error& error) {
            throw std::runtime_error("frame " + std::to_string(frame) + ": the guard of " + name +
                                     " fails: " + error.what());
        }
}

void EnvelopeGuard::apply(Deformer& deformer, int frame) const {
    const std::optional<double> distance = distanceOf(deformer);
    if (distance)
        deformer.distances[frame] = *distance;
    const double own = deformer.source.isNull() ? deformer.own : numberOf(deformer.source);
    const double wanted = own * envelopeLeft(distance.value_or(0.0), width_);
    if (numberOf(deformer.envelope) != wanted)
        setNumber(deformer.envelope, wanted);
}

// of the model that is furthest out; none where all of them are off
std::optional<double> EnvelopeGuard::distanceOf(Deformer& deformer) {
    std::optional<double> largest;
    std::vector<float> controls;
    for (Model& model : deformer.models) {
        const auto& [warp, geometry] = model.place;
        const fs::path directory = modelDirectory(warp, geometry);
        if (!isModelActive(warp, geometry) || !fs::is_directory(directory))
            continue; // of what is missing the deformer speaks itself
        if (!model.ranges)
            model.ranges = rangesOf(directory);
        if (controls.empty())
            controls = controlsOf(warp);
        largest = std::max(largest.value_or(0.0), model.ranges->distance(controls));
    }
    return largest;
}

void EnvelopeGuard::forget(int frame) {
    for (auto& [name, deformer] : deformers_)
        deformer.distances.erase(frame);
}

std::vector<GuardReport> EnvelopeGuard::reports() const {
    std::vector<GuardReport> reports;
    for (const auto& [name, deformer] : deformers_) {
        GuardReport& report = reports.emplace_back();
        report.deformer = name;
        report.frames = deformer.distances.size();
        for (const auto& [frame, distance] : deformer.distances) {
            report.lowered += distance > 0.0 ? 1 : 0;
            report.off += distance >= width_ ? 1 : 0;
            if (distance > report.distance) {
                report.distance = distance;
                report.frame = frame;
            }
        }
    }
    return reports;
}

std::string guardText(const std::vector<GuardReport>& reports, double width) {
    std::string text;
    for (const GuardReport& report : reports)
        text += sentenceOf(report, width) + "\n";
    return text;
}

void noteGuard(const Console& console, const std::vector<GuardReport>& reports, double width) {
    for (const GuardReport& report : reports)
        console.note(sentenceOf(report, width));
}

void writeGuard(JsonWriter& json, const std::vector<GuardReport>& reports, double width) {
    json.Key("guard");
    if (reports.empty())
        return static_cast<void>(json.Null());
    json.StartObject();
    json.Key("width");
    json.Double(width);
    json.Key("deformers");
    json.StartArray();
    for (const GuardReport& report : reports) {
        json.StartObject();
        writeText(json, "deformer", report.deformer);
        writeCount(json, "frames", report.frames);
        writeCount(json, "lowered", report.lowered);
        writeCount(json, "off", report.off);
        json.Key("distance");
        json.Double(report.distance);
        json.Key("frame");
        json.Int(report.frame);
        json.EndObject();
    }
    json.EndArray();
    json.EndObject();
}

} // namespace quarn
