// SPDX-License-Identifier: Apache-2.0
#include "quarn/report/Report.h"

#include "quarn/console/json.h"
#include "quarn/scene/poseTexts.h"

#include <cmath>

namespace quarn {
namespace {

constexpr double inMilliseconds = 1000.0;

void number(JsonWriter& json, const std::string& key, double value) {
    json.Key(key.c_str());
    if (std::isfinite(value))
        json.Double(value);
    else
        json.Null();
}

void number(JsonWriter& json, const std::string& key, const std::optional<double>& value) {
    number(json, key, value.value_or(HUGE_VAL));
}

void whole(JsonWriter& json, const char* key, std::int64_t value) {
    json.Key(key);
    json.Int64(value);
}

template <class Value>
void whole(JsonWriter& json, const char* key, const std::optional<Value>& value) {
    if (value)
        return whole(json, key, static_cast<std::int64_t>(*value));
    json.Key(key);
    json.Null();
}

template <class Write>
void object(JsonWriter& json, const char* key, const Write& write) {
    json.Key(key);
    json.StartObject();
    write();
    json.EndObject();
}

void writeStage(JsonWriter& json, const char* key, const std::optional<StageFigures>& stage, double diagonal,
                const std::string& joint = {}) {
    if (!stage) {
        json.Key(key);
        return static_cast<void>(json.Null());
    }
    object(json, key, [&] {
        for (const auto& [name, value] : {std::pair("mean", stage->mean), std::pair("p99", stage->p99),
                                          std::pair("p9999", stage->p9999), std::pair("max", stage->max)}) {
            number(json, std::string(name) + "_mm", value);
            number(json, std::string(name) + "_percent", diagonal > 0.0 ? 100.0 * value / diagonal : HUGE_VAL);
        }
        object(json, "worst", [&] {
            whole(json, "frame", stage->frame);
            whole(json, "vertex", static_cast<std::int64_t>(stage->vertex));
            if (!joint.empty())
                writeText(json, "joint", joint);
        });
    });
}

void writeTimes(JsonWriter& json, const FrameTimes& times) {
    number(json, "median_ms", times.median() * inMilliseconds);
    number(json, "p99_ms", times.percentile(0.99) * inMilliseconds);
}

void writeGpu(JsonWriter& json, const MeasuredRow& row) {
    if (!row.gpu) {
        json.Key("gpu");
        return static_cast<void>(json.Null());
    }
    object(json, "gpu", [&] {
        writeText(json, "device", row.gpu->device);
        writeCount(json, "deformations", row.gpu->deformations);
        writeCount(json, "fallbacks", row.gpu->fallbacks);
        writeTimes(json, row.gpu->times);
        const MeshErrors& apart = row.gpu->difference;
        writeStage(json, "difference",
                   StageFigures{apart.mean(), apart.percentile(0.99), apart.percentile(0.9999), apart.largest(),
                                apart.worstFrame(), apart.worstVertex()},
                   row.diagonal);
    });
}

// lists of means and of largest ones, in mm, to the nanometre: there may be very many
void writeLists(JsonWriter& json, const char* key, const std::vector<MeanAndMax>& values) {
    json.SetMaxDecimalPlaces(6);
    object(json, key, [&] {
        for (const auto& [name, member] :
             {std::pair("mean_mm", &MeanAndMax::mean), std::pair("max_mm", &MeanAndMax::max)}) {
            json.Key(name);
            json.StartArray();
            for (const MeanAndMax& one : values)
                json.Double(one.*member);
            json.EndArray();
        }
    });
    json.SetMaxDecimalPlaces(JsonWriter::kDefaultMaxDecimalPlaces);
}

void writeBins(JsonWriter& json, const MeasuredRow& row) {
    object(json, "histogram", [&] {
        json.Key("edges_mm");
        json.StartArray();
        for (std::size_t bin = 0; bin <= DistanceBins::count; ++bin)
            json.Double(DistanceBins::edge(bin));
        json.EndArray();
        for (const auto& [name, errors] : {std::pair("before", &row.before), std::pair("after", &row.after)}) {
            json.Key(name);
            json.StartArray();
            for (const std::uint64_t count : errors->bins().counts())
                json.Uint64(count);
            json.EndArray();
        }
    });
}

void writeJitter(JsonWriter& json, const MeasuredRow& row, bool isMotion) {
    if (!isMotion) {
        json.Key("jitter_mm");
        json.Null();
        json.Key("errorJitter_mm");
        return static_cast<void>(json.Null());
    }
    object(json, "jitter_mm", [&] {
        number(json, "skin", row.before.jitter());
        number(json, "target", row.targetJitter);
        number(json, "network", row.after.jitter());
    });
    object(json, "errorJitter_mm", [&] {
        for (const auto& [name, errors] : {std::pair("skin", &row.before), std::pair("network", &row.after)})
            object(json, name, [&, &errors = errors] {
                number(json, "mean", errors->errorJitter().mean);
                number(json, "max", errors->errorJitter().max);
            });
    });
}

void writeLimits(JsonWriter& json, const Row& row) {
    json.Key("limits");
    if (row.judged.empty())
        return static_cast<void>(json.Null());
    json.StartObject();
    for (const Judged& one : row.judged)
        object(json, one.what.c_str(), [&] {
            writeText(json, "unit", one.limit.isMillimetres ? "mm" : "part");
            number(json, "limit", one.limit.value);
            number(json, "found", one.found);
            writeBool(json, "kept", one.isKept);
        });
    json.EndObject();
}

void writeFacts(JsonWriter& json, const char* key, const Facts& facts) {
    object(json, key, [&] {
        for (const auto& [name, text] : facts)
            writeText(json, name.c_str(), text);
    });
}

void writeModel(JsonWriter& json, const ModelFacts& model) {
    object(json, "model", [&] {
        writeText(json, "name", model.name);
        writeCount(json, "shapes", model.shapes);
        writeCount(json, "bytes", model.bytes());
        object(json, "files", [&] {
            for (const auto& [name, bytes] : model.files)
                writeCount(json, name.c_str(), bytes);
        });
    });
}

void writeTraining(JsonWriter& json, const std::optional<TrainingRecord>& training) {
    json.Key("training");
    if (!training)
        return static_cast<void>(json.Null());
    json.StartObject();
    whole(json, "bestEpoch", training->bestEpoch);
    whole(json, "seed", training->seed);
    whole(json, "threads", training->threads);
    number(json, "seconds", training->seconds);
    writeText(json, "device", training->device);
    writeBool(json, "interrupted", training->isInterrupted);
    writeFacts(json, "versions", training->versions);
    writeFacts(json, "settings", training->settings);
    json.EndObject();
}

void writeWhat(JsonWriter& json, const Row& row) {
    const MeasuredRow& measured = row.measured;
    writeText(json, "name", measured.name);
    writeText(json, "mesh", measured.mesh);
    writeText(json, "scene", measured.scene.filename().string());
    writeText(json, "mode", measured.model.mode);
    writeText(json, "kind", measured.model.kind);
    writeText(json, "sentence", sentenceOf(measured));
    writeLimits(json, row);
    writeCount(json, "vertices", measured.vertices);
    whole(json, "controls", measured.model.controls);
    whole(json, "poses", measured.model.poses);
    whole(json, "epochs", row.training ? row.training->epochs : std::nullopt);
    writeCount(json, "smoothingIterations", measured.model.smoothing);
    number(json, "diagonal_mm", measured.diagonal);
}

void writeRow(JsonWriter& json, const Row& row, bool isMotion) {
    const MeasuredRow& measured = row.measured;
    json.StartObject();
    writeWhat(json, row);
    writeStage(json, "skin", row.figures("skin"), measured.diagonal, measured.jointBefore);
    writeStage(json, "base", row.figures("base"), measured.diagonal);
    writeStage(json, "basis", row.figures("basis"), measured.diagonal);
    writeStage(json, "network", row.figures("network"), measured.diagonal, measured.jointAfter);
    object(json, "ratio", [&] {
        number(json, "mean", row.part(&StageFigures::mean));
        number(json, "p9999", row.part(&StageFigures::p9999));
        number(json, "max", row.part(&StageFigures::max));
    });
    writeJitter(json, measured, isMotion);
    object(json, "cpu", [&] { writeTimes(json, measured.cpu); });
    writeGpu(json, measured);
    writeModel(json, measured.model);
    writeTraining(json, row.training);
    object(json, "ranges", [&] { writePoses(json, measured.poses); });
    writeTextOrNull(json, "viewer", row.viewer);
    json.Key("frames");
    json.StartArray();
    for (std::size_t i = 0; i < measured.frames.count(); ++i)
        json.Int(measured.frames.frame(i));
    json.EndArray();
    object(json, "frameErrors", [&] {
        writeLists(json, "before", measured.before.frames());
        writeLists(json, "after", measured.after.frames());
    });
    object(json, "vertexErrors", [&] {
        writeLists(json, "before", measured.before.vertices());
        writeLists(json, "after", measured.after.vertices());
    });
    writeBins(json, measured);
    json.EndObject();
}

} // namespace

std::string jsonOf(const Report& report) {
    rapidjson::StringBuffer buffer;
    JsonWriter json(buffer);
    json.SetIndent(' ', 1);
    json.SetFormatOptions(rapidjson::kFormatSingleLineArray);
    json.StartObject();
    writeText(json, "format", "neuralWarp report");
    writeCount(json, "version", 2);
    writeText(json, "title", report.title);
    writeText(json, "quarn", report.quarn);
    object(json, "processor", [&] {
        writeText(json, "name", report.processor);
        writeCount(json, "threads", report.threads);
    });
    writeBool(json, "isMotion", report.isMotion);
    json.Key("kept");
    if (report.hasLimits())
        json.Bool(report.isKept());
    else
        json.Null();
    json.Key("rows");
    json.StartArray();
    for (const Row& row : report.rows)
        writeRow(json, row, report.isMotion);
    json.EndArray();
    json.EndObject();
    return std::string(buffer.GetString(), buffer.GetSize()) + "\n";
}

} // namespace quarn
