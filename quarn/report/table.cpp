// SPDX-License-Identifier: Apache-2.0
#include "quarn/report/Report.h"

#include "quarn/console/numberText.h"
#include "quarn/report/html.h"

#include <algorithm>

namespace quarn {
namespace {

constexpr int cell = 31; // columns of a stage
constexpr const char* head = "mm: mean, p99, p99.99, max";

std::string number(double value, int width, int decimals) {
    const std::string text = fixedText(value, decimals);
    const auto wanted = static_cast<std::size_t>(width);
    return std::string(wanted > text.size() ? wanted - text.size() : 0, ' ') + text;
}

std::string number(const std::optional<double>& value, int width, int decimals) {
    return value ? number(*value, width, decimals) : std::string(static_cast<std::size_t>(width) - 1, ' ') + "-";
}

std::string padded(const std::string& text, std::size_t width) {
    return text + std::string(width > text.size() ? width - text.size() : 0, ' ');
}

std::string centred(const std::string& text) {
    return padded(std::string((cell - text.size()) / 2, ' ') + text, cell);
}

std::string stageText(const std::optional<StageFigures>& stage) {
    if (!stage)
        return std::string(cell - 1, ' ') + "-";
    return number(stage->mean, 7, 3) + " " + number(stage->p99, 7, 3) + " " + number(stage->p9999, 7, 3) + " " +
           number(stage->max, 7, 3);
}

std::string gpuCells(const Row& row) {
    const auto& gpu = row.measured.gpu;
    if (!gpu)
        return "    - | -";
    return number(1000.0 * gpu->times.median(), 5, 3) + " | " + roughText(gpu->difference.largest()) + " mm";
}

} // namespace

std::string tableOf(const Report& report) {
    std::size_t width = std::string(head).size();
    for (const Row& row : report.rows)
        width = std::max(width, row.label().size());
    std::string text = padded(head, width);
    for (const char* called : {"skin", "zero deltas", "basis", "network"})
        text += " | " + centred(called);
    text += " |   mean p99.99    max | ms CPU   GPU | GPU from CPU, max\n";
    for (const Row& row : report.rows) {
        text += padded(row.label(), width);
        for (const char* stage : {"skin", "base", "basis", "network"})
            text += " | " + stageText(row.figures(stage));
        text += " |";
        for (const auto figure : {&StageFigures::mean, &StageFigures::p9999, &StageFigures::max})
            text += " " + number(row.part(figure), 6, 3);
        text += " | " + number(1000.0 * row.measured.cpu.median(), 6, 3) + " " + gpuCells(row) + "\n";
    }
    for (const Row& row : report.rows)
        text += (report.rows.size() > 1 ? row.measured.name + ": " : "") + sentenceOf(row.measured) +
                (row.judged.empty() ? "" : " " + verdictOf(row)) + "\n";
    return text + gpuText(report) + "\n";
}

} // namespace quarn
