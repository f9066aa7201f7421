// SPDX-License-Identifier: Apache-2.0
#include "quarn/report/Row.h"

#include "quarn/console/numberText.h"
#include "quarn/report/html.h"

#include <algorithm>
#include <cmath>

namespace quarn {
namespace {

// so many decimals that two digits count
std::string twoDigits(double value) {
    const int decimals = value >= 9.95 ? 0 : value >= 0.995 ? 1 : value >= 0.0995 ? 2 : 3;
    return fixedText(value, decimals);
}

StageFigures figuresOf(const MeshErrors& errors) {
    return {errors.mean(),    errors.percentile(0.99), errors.percentile(0.9999),
            errors.largest(), errors.worstFrame(),     errors.worstVertex()};
}

std::string placeOf(const MeasuredRow& row) {
    const std::string vertex = "vertex " + std::to_string(row.after.worstVertex());
    return row.jointAfter.empty() ? vertex : row.jointAfter + " (" + vertex + ")";
}

// what the network does to the error that there is without it
std::string effectOf(const MeasuredRow& row) {
    const double before = row.before.mean(), after = row.after.mean();
    if (before == 0.0)
        return "There is no error to be taken away, and the network adds " + lengthText(after) + " in the mean";
    if (after > before)
        return "The network adds " + percentText(after / before - 1.0) + " to the error";
    return "The network takes away " + percentText(1.0 - after / before) + " of the error";
}

} // namespace

std::string Row::label() const {
    return measured.name + ", " + measured.model.mode + ", " + measured.model.kind;
}

std::optional<StageFigures> Row::figures(const std::string& stage) const {
    if (stage == "skin")
        return figuresOf(measured.before);
    if (stage == "network")
        return figuresOf(measured.after);
    if (!evaluation)
        return {};
    return stage == "base" ? std::optional(evaluation->zeroDeltas) : evaluation->basis;
}

std::optional<double> Row::part(double StageFigures::*figure) const {
    double before = figuresOf(measured.before).*figure;
    if (evaluation)
        before = std::min(before, evaluation->zeroDeltas.*figure);
    if (!(before > 0.0))
        return {};
    return figuresOf(measured.after).*figure / before;
}

bool Row::isKept() const {
    return std::all_of(judged.begin(), judged.end(), [](const Judged& one) { return one.isKept; });
}

std::vector<Judged> judge(const Row& row, const RowRequest& request) {
    std::vector<Judged> judged;
    const auto add = [&](const char* what, const std::optional<Limit>& limit, double StageFigures::*figure) {
        if (!limit)
            return;
        const double left = figuresOf(row.measured.after).*figure;
        // where there was nothing before, anything that is left is too much
        const double found = limit->isMillimetres ? left : row.part(figure).value_or(left > 0.0 ? HUGE_VAL : 0.0);
        judged.push_back({what, *limit, found, found <= limit->value});
    };
    add("mean", request.mean, &StageFigures::mean);
    add("max", request.max, &StageFigures::max);
    return judged;
}

std::string sentenceOf(const MeasuredRow& row) {
    return effectOf(row) + " at " + twoDigits(1000.0 * row.cpu.median()) + " ms a frame; worst " +
           lengthText(row.after.largest()) + " at " + placeOf(row) + ", frame " +
           std::to_string(row.after.worstFrame()) + ".";
}

std::string verdictOf(const Row& row) {
    if (row.judged.empty())
        return {};
    std::string text = row.isKept() ? "Limits kept: " : "Limits not kept: ";
    for (const Judged& one : row.judged) {
        const std::string found = std::isinf(one.found)     ? "something where there was nothing"
                                  : one.limit.isMillimetres ? numberText(std::round(one.found * 1e4) / 1e4) + " mm"
                                                            : numberText(std::round(one.found * 1e4) / 100.0) + " %";
        text += (&one == row.judged.data() ? "" : ", ") + std::string(one.what == "mean" ? "mean " : "largest ") +
                found + " (" + one.limit.text() + " allowed)";
    }
    return text + ".";
}

std::string lengthText(double millimetres) {
    if (millimetres == 0.0)
        return "0 mm";
    return millimetres < 0.01 ? "less than 0.01 mm" : twoDigits(millimetres) + " mm";
}

std::string percentText(double part) {
    const double percent = 100.0 * part;
    // 100 % is all of it, and nothing less
    if (percent > 99.0 && percent < 100.0)
        return fixedText(std::floor(10.0 * percent) / 10.0, 1) + " %";
    return percent > 0.0 && percent < 0.95 ? fixedText(percent, 1) + " %" : fixedText(percent, 0) + " %";
}

} // namespace quarn
