// SPDX-License-Identifier: Apache-2.0
#include "quarn/dataset/smoothingChoice.h"

#include "quarn/console/numberText.h"

#include <algorithm>
#include <cmath>
#include <iomanip>
#include <limits>
#include <locale>
#include <sstream>

namespace quarn {
namespace {

constexpr double nearJitter = 1.5, nearError = 1.05; // of the least
constexpr double flips = 90.0;                       // degrees
constexpr double jumps = 2.0;                        // times the jitter of Offset deltas
constexpr double seen = 1.0 / 2000.0;                // of the diagonal: 0.3 mm of an arm
constexpr double millimetres = 1000.0;

double orInfinity(double figure) {
    return std::isfinite(figure) ? figure : std::numeric_limits<double>::infinity();
}

template <class Figure, class Counts>
double least(const std::vector<KindFigures>& kinds, const Figure& figure, const Counts& counts) {
    double smallest = std::numeric_limits<double>::infinity();
    for (const KindFigures& kind : kinds)
        if (counts(kind))
            smallest = std::min(smallest, orInfinity(figure(kind)));
    return smallest;
}

// the kinds whose figure is at most so many times the least of them
template <class Figure>
std::vector<KindFigures> near(const std::vector<KindFigures>& kinds, double times, const Figure& figure) {
    const double limit = times * least(kinds, figure, [](const KindFigures&) { return true; });
    std::vector<KindFigures> kept;
    for (const KindFigures& kind : kinds)
        if (orInfinity(figure(kind)) <= limit)
            kept.push_back(kind);
    return kept;
}

std::vector<KindFigures> withoutFlips(const std::vector<KindFigures>& kinds) {
    const double leastTurn = least(
        kinds, [](const KindFigures& kind) { return kind.turn; },
        [](const KindFigures& kind) { return kind.kind.isSurface(); });
    std::vector<KindFigures> kept;
    for (const KindFigures& kind : kinds)
        if (kind.turn <= std::max(flips, 2.0 * leastTurn))
            kept.push_back(kind);
    return kept;
}

} // namespace

std::vector<DeltaKind> comparedKinds() {
    return {{0, 0}, {1, 0}, {1, 2}, {1, 5}, {1, 10}, {1, 20}, {1, 40}};
}

std::size_t chosenKind(const SmoothingStudy& study) {
    std::vector<KindFigures> kinds = withoutFlips(study.kinds);
    kinds = near(kinds, nearJitter, [](const KindFigures& kind) { return kind.jitter; });
    kinds = near(kinds, nearError, [](const KindFigures& kind) { return kind.mean; });
    const auto fewest = std::min_element(kinds.begin(), kinds.end(), [](const KindFigures& a, const KindFigures& b) {
        return a.kind.smoothingIterations < b.kind.smoothingIterations;
    });
    if (fewest == kinds.end())
        return 0;
    const auto found = std::find_if(study.kinds.begin(), study.kinds.end(),
                                    [&](const KindFigures& kind) { return kind.kind == fewest->kind; });
    return static_cast<std::size_t>(found - study.kinds.begin());
}

std::string jumpWarning(const SmoothingStudy& study, const std::string& mesh, double diagonal, double metersPerUnit) {
    const KindFigures& own = study.kinds[0];
    const KindFigures& offset = study.kinds[1];
    if (!(own.jitter > jumps * offset.jitter) || !(own.jitter > seen * diagonal))
        return {};
    const auto text = [&](double length) { return numberText(millimetres * metersPerUnit * length) + " mm"; };
    return own.kind.text() + " move " + mesh + " in jumps: between poses the correction has a jitter of " +
           text(own.jitter) + ", where that of Offset deltas has " + text(offset.jitter) +
           ", and its frames turn by up to " + std::to_string(std::lround(own.turn)) +
           " degrees in a step. --smoothing auto compares kinds of deltas, and takes one that does not";
}

std::string choiceText(const KindChoice& choice, const std::string& mesh, double metersPerUnit) {
    const SmoothingStudy& study = choice.study;
    const double mm = millimetres * metersPerUnit;
    std::ostringstream text;
    text.imbue(std::locale::classic());
    text << "chosen: " << study.kinds[choice.chosen].kind.text() << " for " << mesh << ", of " << study.kinds.size()
         << " kinds, each fitted to " << study.fitted << " frames, and tested on " << study.tested << " others and on "
         << study.steps << " steps\n"
         << "  deltas   passes  error mm  its p99  jitter mm  turn of a frame\n"
         << std::fixed;
    for (std::size_t kind = 0; kind < study.kinds.size(); ++kind) {
        const KindFigures& figures = study.kinds[kind];
        text << (kind == choice.chosen ? "* " : "  ") << std::left << std::setw(8) << figures.kind.label() << std::right
             << std::setw(7) << figures.kind.smoothingIterations << std::setprecision(4) << std::setw(10)
             << mm * figures.mean << std::setw(9) << mm * figures.p99 << std::setw(11) << mm * figures.jitter
             << std::setprecision(1) << std::setw(9) << figures.turn << " degrees\n";
    }
    return text.str();
}

void writeChoice(JsonWriter& writer, const std::optional<KindChoice>& choice, double metersPerUnit) {
    writer.Key("smoothing");
    if (!choice) {
        writer.Null();
        return;
    }
    const auto number = [&writer](const char* key, double value) {
        writer.Key(key);
        if (std::isfinite(value))
            writer.Double(value);
        else
            writer.Null();
    };
    const double mm = millimetres * metersPerUnit;
    writer.StartObject();
    writeCount(writer, "fittedFrames", choice->study.fitted);
    writeCount(writer, "testedFrames", choice->study.tested);
    writeCount(writer, "steps", choice->study.steps);
    writer.Key("kinds");
    writer.StartArray();
    for (const KindFigures& figures : choice->study.kinds) {
        writer.StartObject();
        writeText(writer, "deltaMode", figures.kind.label());
        writeCount(writer, "smoothingIterations", static_cast<std::size_t>(figures.kind.smoothingIterations));
        writeBool(writer, "isChosen", figures.kind == choice->study.kinds[choice->chosen].kind);
        number("errorMm", mm * figures.mean);
        number("errorP99Mm", mm * figures.p99);
        number("jitterMm", mm * figures.jitter);
        number("turnDegrees", figures.turn);
        writer.EndObject();
    }
    writer.EndArray();
    writer.EndObject();
}

} // namespace quarn
