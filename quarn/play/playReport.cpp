// SPDX-License-Identifier: Apache-2.0
#include "quarn/play/playReport.h"

#include "quarn/console/json.h"
#include "quarn/play/playing.h"
#include "quarn/scene/modelJson.h"
#include "quarn/scene/poseTexts.h"

#include <locale>
#include <sstream>
#include <utility>

namespace quarn {
namespace {

constexpr double inMilliseconds = 1000.0;
constexpr double inMillimetres = 1000.0;
constexpr double inPercent = 100.0;

struct Scale {
    double millimetres; ///< of a unit of the scene
    double percent;     ///< of the diagonal; 0 where it is 0
};

Scale scaleOf(const PlayResult& result, double metersPerUnit) {
    return {inMillimetres * metersPerUnit, result.boxDiagonal > 0.0 ? inPercent / result.boxDiagonal : 0.0};
}

using Measure = std::pair<const char*, double>;

std::vector<Measure> measuresOf(const Distances& distances) {
    return {{"mean", distances.mean()},
            {"p99", distances.percentile(0.99)},
            {"p99.99", distances.percentile(0.9999)},
            {"max", distances.largest()}};
}

double framesPerSecond(const FrameTimes& times) {
    const double total = times.total();
    return total > 0.0 ? static_cast<double>(times.count()) / total : 0.0;
}

void printDistances(std::ostream& out, const char* what, const Comparison& comparison, const Scale& scale) {
    const Distances& distances = comparison.distances;
    out << what << ':';
    for (const auto& [name, value] : measuresOf(distances))
        out << ' ' << name << ' ' << value * scale.millimetres << " mm (" << value * scale.percent << " %)"
            << (std::string(name) == "max" ? "" : ",");
    out << " at vertex " << distances.worstVertex() << " in frame " << distances.worstFrame() << '\n';
}

void printFrames(std::ostream& out, const PlayResult& result) {
    if (result.framesKept > 0)
        out << "an earlier run has made the first " << result.framesKept << " of them; what follows is of the others\n";
    if (result.framesSkipped > 0)
        out << "the files of " << result.framesSkipped << " of them were there; what follows is of the others\n";
}

void printTimes(std::ostream& out, const FrameTimes& times) {
    if (times.count() == 0)
        return static_cast<void>(out << "no frame was timed\n");
    out << times.count() << " frames timed: " << framesPerSecond(times) << " frames a second, median "
        << times.median() * inMilliseconds << " ms, p99 " << times.percentile(0.99) * inMilliseconds << " ms, worst "
        << times.percentile(1.0) * inMilliseconds << " ms in frame " << times.worstFrame() << '\n';
}

void printGpu(std::ostream& out, const GpuUse& gpu) {
    out << "GPU: " << gpu.onGpu << " deformations on " << (gpu.device.empty() ? "no device" : gpu.device) << ", "
        << gpu.onCpu << " on the CPU";
    if (gpu.fallbacks > 0)
        out << ", " << gpu.fallbacks << " of them since the GPU failed";
    out << '\n';
}

void number(JsonWriter& json, const char* key, double value) {
    json.Key(key);
    json.Double(value);
}

void whole(JsonWriter& json, const char* key, std::int64_t value) {
    json.Key(key);
    json.Int64(value);
}

void writeTimes(JsonWriter& json, const PlayResult& result) {
    number(json, "framesPerSecond", framesPerSecond(result.times));
    number(json, "medianMs", result.times.median() * inMilliseconds);
    number(json, "p99Ms", result.times.percentile(0.99) * inMilliseconds);
    number(json, "worstMs", result.times.percentile(1.0) * inMilliseconds);
    whole(json, "worstFrame", result.times.worstFrame());
    json.Key("phaseMediansMs");
    json.StartObject();
    for (const auto& [name, seconds] : result.phases)
        number(json, name.c_str(), percentileOf(seconds, 0.5) * inMilliseconds);
    json.EndObject();
}

void writeGpu(JsonWriter& json, const std::optional<GpuUse>& gpu) {
    json.Key("gpu");
    if (!gpu)
        return static_cast<void>(json.Null());
    json.StartObject();
    writeText(json, "device", gpu->device);
    whole(json, "onGpu", static_cast<std::int64_t>(gpu->onGpu));
    whole(json, "onCpu", static_cast<std::int64_t>(gpu->onCpu));
    whole(json, "fallbacks", static_cast<std::int64_t>(gpu->fallbacks));
    json.EndObject();
}

void writeShapes(JsonWriter& json, const std::optional<ShapesOfMotion>& shapes) {
    json.Key("shapes");
    if (!shapes)
        return static_cast<void>(json.Null());
    json.StartObject();
    whole(json, "count", static_cast<std::int64_t>(shapes->count));
    number(json, "errorMm", shapes->error);
    json.EndObject();
}

void writeComparison(JsonWriter& json, const char* key, const std::optional<Comparison>& comparison,
                     const Scale& scale) {
    json.Key(key);
    if (!comparison)
        return static_cast<void>(json.Null());
    const Distances& distances = comparison->distances;
    json.StartObject();
    for (const auto& [unit, factor] : {Measure{"mm", scale.millimetres}, Measure{"percent", scale.percent}}) {
        json.Key(unit);
        json.StartObject();
        for (const auto& [name, value] : measuresOf(distances))
            number(json, name, value * factor);
        json.EndObject();
    }
    whole(json, "worstVertex", static_cast<std::int64_t>(distances.worstVertex()));
    whole(json, "worstFrame", distances.worstFrame());
    number(json, "jitterMm", comparison->jitter.largest() * scale.millimetres);
    json.EndObject();
}

} // namespace

std::string playText(const PlayResult& result, const PlayPlan& plan, double metersPerUnit) {
    std::ostringstream out;
    out.imbue(std::locale::classic());
    out.precision(4);
    out << "played frames " << plan.frames.first << " to " << plan.frames.last << ", " << result.vertexCount
        << " vertices" << (plan.model.name.empty() ? "" : ", model " + plan.model.name) << '\n'
        << (plan.model.note.empty() ? "" : plan.model.note + "\n");
    printFrames(out, result);
    printTimes(out, result.times);
    if (result.gpu)
        printGpu(out, *result.gpu);
    for (const auto& [name, seconds] : result.phases)
        out << "  " << name << ": median " << percentileOf(seconds, 0.5) * inMilliseconds << " ms\n";
    if (result.shapes)
        out << "written with " << result.shapes->count << " shapes, at most " << result.shapes->error
            << " mm from any frame\n";
    out << guardText(result.guard, plan.guardWidth.value_or(0.0));
    out << posesText(result.poses);
    if (!result.mesh)
        return out.str();
    const Scale scale = scaleOf(result, metersPerUnit);
    out << "in brackets: of the diagonal of the rest mesh's box, " << result.boxDiagonal * scale.millimetres << " mm\n";
    printDistances(out, "distance", *result.mesh, scale);
    if (result.before)
        printDistances(out, "distance before the deformer", *result.before, scale);
    out << "jitter: " << result.mesh->jitter.largest() * scale.millimetres << " mm";
    if (result.before)
        out << ", before the deformer " << result.before->jitter.largest() * scale.millimetres << " mm";
    out << ", of the other mesh " << result.targetJitter.largest() * scale.millimetres << " mm\n";
    return out.str();
}

std::string playJson(const PlayResult& result, const PlayPlan& plan, double metersPerUnit) {
    rapidjson::StringBuffer buffer;
    JsonWriter json(buffer);
    const Scale scale = scaleOf(result, metersPerUnit);
    json.StartObject();
    whole(json, "firstFrame", plan.frames.first);
    whole(json, "lastFrame", plan.frames.last);
    whole(json, "step", plan.frames.step);
    writeModel(json, plan.model);
    whole(json, "vertices", static_cast<std::int64_t>(result.vertexCount));
    whole(json, "framesKept", static_cast<std::int64_t>(result.framesKept));
    whole(json, "framesSkipped", static_cast<std::int64_t>(result.framesSkipped));
    whole(json, "framesTimed", static_cast<std::int64_t>(result.times.count()));
    writeTimes(json, result);
    writeGpu(json, result.gpu);
    writeShapes(json, result.shapes);
    writeGuard(json, result.guard, plan.guardWidth.value_or(0.0));
    writePoses(json, result.poses);
    writeComparison(json, "distance", result.mesh, scale);
    writeComparison(json, "before", result.before, scale);
    if (result.mesh) {
        number(json, "otherJitterMm", result.targetJitter.largest() * scale.millimetres);
        number(json, "boxDiagonalMm", result.boxDiagonal * scale.millimetres);
    }
    json.EndObject();
    return std::string(buffer.GetString()) + "\n";
}

} // namespace quarn
