// SPDX-License-Identifier: Apache-2.0
#include "quarn/report/Report.h"
#include "quarn/report/escaped.h"
#include "quarn/report/html.h"
#include "quarn/report/pageParts.h"
#include "quarn/report/style.h"

#include "quarn/console/numberText.h"
#include "storage/encodings.h"
#include "storage/readWholeFile.h"

#include <algorithm>
#include <cctype>

namespace quarn {
namespace {

// --- what is said first ---

std::string leadOf(const Row& row, bool hasName) {
    const std::string verdict = verdictOf(row);
    return with("p", (hasName ? said("strong", row.measured.name + ": ") : "") + escaped(sentenceOf(row.measured)),
                "lead") +
           (verdict.empty() ? "" : said("p", verdict, row.isKept() ? "verdict kept" : "verdict missed")) + "\n";
}

// of file names in an address
std::string address(const std::string& name) {
    constexpr std::string_view digits = "0123456789ABCDEF";
    std::string all;
    for (const char character : name) {
        const auto byte = static_cast<unsigned char>(character);
        if (std::isalnum(byte) != 0 || character == '-' || character == '_' || character == '.')
            all += character;
        else
            all += {'%', digits[byte >> 4U], digits[byte & 15U]};
    }
    return all;
}

std::string viewerOf(const Row& row) {
    if (row.viewer.empty())
        return row.whyNoViewer.empty() ? "" : said("p", row.whyNoViewer, "weak") + "\n";
    return "<p><a href=\"" + escaped(address(row.viewer)) + "\">Turn it in the browser</a> " +
           said("span", "(" + row.viewer + ", which lies beside this file)", "weak") + "</p>\n";
}

// --- tables ---

std::string lengthCell(double millimetres, double diagonal) {
    return "<td>" + fixedText(millimetres, 3) +
           (diagonal > 0.0 ? said("small", fixedText(100.0 * millimetres / diagonal, 3) + " %") : "") + "</td>";
}

// what there is of all rows at a glance
std::string overview(const Report& report) {
    std::string text = "<table class=\"wide\"><tr><th></th><th>mean before, mm</th><th>mean, mm</th>"
                       "<th class=\"more\">p99.99, mm</th><th>largest, mm</th><th>taken away</th>"
                       "<th>ms a frame</th><th class=\"more\">model</th></tr>\n";
    for (const Row& row : report.rows) {
        const StageFigures skin = *row.figures("skin"), network = *row.figures("network");
        text += "<tr>" + with("td", said("span", row.measured.name) +
                                        said("small", row.measured.model.mode + ", " + row.measured.model.kind));
        for (const double value : {skin.mean, network.mean})
            text += said("td", fixedText(value, 3));
        text += said("td", fixedText(network.p9999, 3), "more") + said("td", fixedText(network.max, 3)) +
                said("td", skin.mean > 0.0 ? percentText(1.0 - network.mean / skin.mean) : "-") +
                said("td", fixedText(1000.0 * row.measured.cpu.median(), 3)) +
                said("td", sizeText(row.measured.model.bytes()), "more") + "</tr>\n";
    }
    return text + "</table>\n";
}

std::string stages(const Row& row) {
    std::string text = "<table><tr><th></th><th>mean, mm</th><th>p99</th><th>p99.99</th><th>largest</th><th>at</th>"
                       "</tr>\n";
    const double diagonal = row.measured.diagonal;
    for (const auto& [name, called, joint] :
         {std::tuple("skin", "skin", row.measured.jointBefore), std::tuple("base", "zero deltas", std::string()),
          std::tuple("basis", "basis", std::string()), std::tuple("network", "network", row.measured.jointAfter)}) {
        const std::optional<StageFigures> stage = row.figures(name);
        if (!stage)
            continue;
        text += std::string(name) == "network" ? "<tr class=\"best\">" : "<tr>";
        text += said("td", called);
        for (const double value : {stage->mean, stage->p99, stage->p9999, stage->max})
            text += lengthCell(value, diagonal);
        text +=
            with("td", escaped("vertex " + std::to_string(stage->vertex) + ", frame " + std::to_string(stage->frame)) +
                           (joint.empty() ? "" : said("small", joint))) +
            "</tr>\n";
    }
    return text + "</table>\n";
}

std::string timesOf(const Row& row) {
    const auto cells = [](const char* where, const std::string& device, const FrameTimes& times) {
        return "<tr>" + with("td", escaped(where) + said("small", device)) +
               said("td", fixedText(1000.0 * times.median(), 3)) +
               said("td", fixedText(1000.0 * times.percentile(0.99), 3)) + said("td", std::to_string(times.count())) +
               "</tr>\n";
    };
    std::string text = "<table><tr><th>time of a frame</th><th>median, ms</th><th>p99, ms</th><th>frames timed</th>"
                       "</tr>\n" +
                       cells("CPU", "", row.measured.cpu);
    if (const auto& gpu = row.measured.gpu; gpu && gpu->deformations > 0)
        text += cells("GPU", gpu->device + ", at most " + roughText(gpu->difference.largest()) + " mm from the CPU",
                      gpu->times);
    return text + "</table>\n";
}

// --- pictures ---

std::string pictures(const Row& row) {
    if (row.pictures.empty())
        return row.whyNoPictures.empty() ? "" : said("p", row.whyNoPictures, "weak") + "\n";
    constexpr std::uint64_t most = std::uint64_t{64} << 20U;
    std::string text =
        said("h3", "Before and after") +
        said("p", "The last colour of both is " + numberText(row.pictureRange) + " mm from the target.", "weak") + "\n";
    for (const RowPicture& picture : row.pictures)
        text += "<figure><img alt=\"" + escaped(picture.caption) + "\" src=\"data:image/png;base64," +
                storage::base64(storage::readWholeFile(picture.file, most)) + "\">" +
                said("figcaption", picture.caption) + "</figure>\n";
    return text;
}

// --- all of it ---

std::string sectionOf(const Report& report, const Row& row) {
    const bool hasSeveral = report.rows.size() > 1;
    return "<section>\n" + said("h2", hasSeveral ? row.label() : "Figures") + "\n" +
           (hasSeveral ? leadOf(row, false) : "") + stages(row) + timesOf(row) + said("h3", "Where the error is") +
           chartsOf(row) + pictures(row) + said("h3", "About the model") + factsOf(report, row) + "</section>\n";
}

std::string leads(const Report& report) {
    std::string text;
    for (const Row& row : report.rows)
        text += leadOf(row, report.rows.size() > 1) + viewerOf(row);
    return text;
}

std::string notes(const Report& report) {
    std::string text = "skin: what comes into the deformer. ";
    if (std::any_of(report.rows.begin(), report.rows.end(), [](const Row& row) { return row.evaluation.has_value(); }))
        text += "zero deltas: the deformer with a network that gives zeros. basis: the best that the principal shapes "
                "could do. ";
    text += "network: what the deformer gives out. Small figures are parts of the diagonal of the rest mesh's box. "
            "p99.99: one distance of ten thousand, of all vertices in all frames, is larger. ";
    if (report.isMotion)
        text += "Jitter: the second difference over three frames; that of what is left trembles where the target does "
                "not. ";
    return text + "Times are those of the whole scene, on " + report.processor + " (" +
           counted(report.threads, "thread") + "). " + gpuText(report) + ". Made by " + report.quarn + ".";
}

} // namespace

std::string pageOf(const Report& report) {
    std::string text = "<!DOCTYPE html>\n<html lang=\"en\"><head><meta charset=\"utf-8\">\n"
                       "<meta http-equiv=\"Content-Security-Policy\" content=\"default-src 'none'; img-src data:; "
                       "style-src 'unsafe-inline'\">\n"
                       "<meta name=\"viewport\" content=\"width=device-width, initial-scale=1\">\n" +
                       said("title", report.title) + "\n<style>" + reportStyle + "</style></head>\n<body>\n" +
                       said("h1", report.title) + "\n" + leads(report);
    text += said("p",
                 std::string(report.isMotion ? "A motion" : "Poses") +
                     ": the mesh without and with the network, against the target.",
                 "weak");
    if (report.rows.size() > 1)
        text += overview(report);
    for (const Row& row : report.rows)
        text += sectionOf(report, row);
    return text + said("p", notes(report), "weak") + "\n</body></html>\n";
}

} // namespace quarn
