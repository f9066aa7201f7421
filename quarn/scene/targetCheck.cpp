// SPDX-License-Identifier: Apache-2.0
#include "quarn/scene/targetCheck.h"

#include "quarn/console/Log.h"
#include "quarn/console/interrupt.h"
#include "quarn/scene/HostErrors.h"
#include "quarn/scene/meshes.h"

#include "openquarn_app/Session.h"

#include <algorithm>
#include <cmath>
#include <stdexcept>

namespace quarn {
namespace {

// the time is what it was when this ends
class AtOtherTimes {
public:
    explicit AtOtherTimes(OpenQuarn::Session& host)
        : host_(host)
        , before_(host.time()) {}
    ~AtOtherTimes() { host_.setTime(before_); }
    AtOtherTimes(const AtOtherTimes&) = delete;
    AtOtherTimes& operator=(const AtOtherTimes&) = delete;

private:
    OpenQuarn::Session& host_;
    double before_;
};

std::vector<double> only(const std::vector<std::size_t>& vertices, const std::vector<double>& all) {
    std::vector<double> some;
    some.reserve(3 * vertices.size());
    for (const std::size_t vertex : vertices)
        for (std::size_t axis = 0; axis < 3; ++axis)
            some.push_back(all.at(3 * vertex + axis));
    return some;
}

// both read whole frames, of which the vertices that count are kept
FitInput inputOf(OpenQuarn::Session& host, const WarpGeometry& geometry, const HPlug& rest,
                 const TargetFrames& frames) {
    FitInput input;
    readPoints(rest, input.rest);
    const std::size_t numbers = input.rest.size();
    input.diagonal = diagonalOf(rest);
    if (!frames.vertices.empty())
        input.rest = only(frames.vertices, input.rest);
    input.vertices = input.rest.size() / 3;
    input.skin = [&host, &geometry, &frames, numbers](std::size_t frame, std::vector<double>& xyz) {
        throwIfInterrupted();
        host.setTime(frames.time(frame));
        readPoints(geometry.input, xyz);
        if (xyz.size() != numbers)
            throw std::runtime_error("the skin has " + std::to_string(xyz.size() / 3) + " vertices, and the mesh " +
                                     std::to_string(numbers / 3) + " at rest");
        if (!frames.vertices.empty())
            xyz = only(frames.vertices, xyz);
    };
    input.cache = [&frames](std::size_t frame, std::vector<double>& xyz) {
        throwIfInterrupted();
        frames.read(frame, xyz);
        if (!frames.vertices.empty())
            xyz = only(frames.vertices, xyz);
    };
    input.frames = frames.count;
    input.first = frames.first;
    input.last = frames.last;
    input.reach = frames.reach;
    return input;
}

void writeLength(JsonWriter& writer, const char* key, double value, const FitContext& context) {
    writer.Key(key);
    constexpr double millimetres = 1000.0;
    if (std::isfinite(value))
        writer.Double(millimetres * context.metersPerUnit * value);
    else
        writer.Null();
}

} // namespace

std::size_t affordableReach(std::size_t vertices) {
    // a shift that is tried costs the reading of up to twelve frames: 2e8 numbers are one to two seconds
    constexpr std::size_t numbers = 200'000'000, numbersOfAVertex = 36;
    return std::clamp<std::size_t>(numbers / (numbersOfAVertex * std::max<std::size_t>(1, vertices)), 3, 50);
}

std::optional<TargetFit> compareWithSkin(OpenQuarn::Session& host, const WarpGeometry& geometry, const HPlug& rest,
                                         const TargetFrames& frames, const Console& console) {
    const Stage stage(
        [&] { return std::string("comparing the ") + frames.role + " of " + geometry.name + " with its skin"; });
    const AtOtherTimes later(host);
    const HostErrors errors;
    std::string problem;
    try {
        const FitInput input = inputOf(host, geometry, rest, frames);
        if (input.vertices == 0)
            throw std::runtime_error("the mesh has no vertices");
        TargetFit fit = fitTarget(input);
        problem = errors.text();
        if (problem.empty())
            return fit;
    } catch (const Interrupted&) {
        throw;
    } catch (const std::exception& error) {
        problem = errors.text().empty() ? error.what() : errors.text();
    }
    console.warn(std::string("the ") + frames.role + " of " + geometry.name +
                 " was not compared with the skin: " + problem);
    return {};
}

void tell(const FitVerdict& verdict, bool anyway, const Console& console) {
    if (!verdict.refusal.empty() && !anyway)
        throw std::runtime_error(verdict.refusal);
    for (const std::string& sentence : {verdict.refusal, verdict.warning})
        if (!sentence.empty())
            console.warn(sentence);
    if (!verdict.note.empty())
        console.note(verdict.note);
}

void writeFit(JsonWriter& writer, const std::optional<TargetFit>& fit, const FitContext& context, bool isMended) {
    writer.Key("fit");
    if (!fit) {
        writer.Null();
        return;
    }
    const FitDistance& distance = isMended ? fit->mended : fit->asItIs;
    writer.StartObject();
    writeCount(writer, "frames", distance.frames);
    writeLength(writer, "meanMm", distance.mean, context);
    writeLength(writer, "largestMm", distance.largest, context);
    writeLength(writer, "diagonalMm", fit->diagonal, context);
    writeText(writer, "looksAsIf", causeText(*fit, context));
    writeText(writer, "mendingFlags", flagText(*fit, context));
    writeBool(writer, "aligned", isMended);
    writer.EndObject();
}

} // namespace quarn
