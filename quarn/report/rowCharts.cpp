// SPDX-License-Identifier: Apache-2.0
#include "quarn/report/Row.h"
#include "quarn/report/charts.h"
#include "quarn/report/pageParts.h"

#include <algorithm>
#include <functional>
#include <numeric>

namespace quarn {
namespace {

std::vector<double> valuesOf(const std::vector<MeanAndMax>& all, double MeanAndMax::*member) {
    std::vector<double> values;
    values.reserve(all.size());
    for (const MeanAndMax& one : all)
        values.push_back(one.*member);
    return values;
}

std::vector<double> descending(std::vector<double> values) {
    std::sort(values.begin(), values.end(), std::greater<>());
    return values;
}

std::string chartOf(const std::string& title, const Axis& x, std::vector<Curve> curves, int decades) {
    std::vector<const std::vector<double>*> values;
    values.reserve(curves.size());
    for (const Curve& curve : curves)
        values.push_back(&curve.y);
    LineChart chart{title, x, {logScaleOf(values, decades), "mm"}, std::move(curves)};
    return svgOf(chart);
}

std::string overFrames(const MeasuredRow& row) {
    const auto& before = row.before.frames();
    const auto& after = row.after.frames();
    const FrameRange& frames = row.frames;
    const double last = frames.count() > 1 ? frames.frame(frames.count() - 1) : frames.first + 1;
    return chartOf("Error over the frames", {{static_cast<double>(frames.first), last}, "frame"},
                   {{"before, largest", "before", true, valuesOf(before, &MeanAndMax::max)},
                    {"before, mean", "before", false, valuesOf(before, &MeanAndMax::mean)},
                    {"after, largest", "after", true, valuesOf(after, &MeanAndMax::max)},
                    {"after, mean", "after", false, valuesOf(after, &MeanAndMax::mean)}},
                   4);
}

std::string overVertices(const MeasuredRow& row) {
    const auto before = row.before.vertices(), after = row.after.vertices();
    return chartOf("Error over the vertices, the worst first", {{0.0, 100.0}, "% of the vertices"},
                   {{"before, largest", "before", true, descending(valuesOf(before, &MeanAndMax::max))},
                    {"before, mean", "before", false, descending(valuesOf(before, &MeanAndMax::mean))},
                    {"after, largest", "after", true, descending(valuesOf(after, &MeanAndMax::max))},
                    {"after, mean", "after", false, descending(valuesOf(after, &MeanAndMax::mean))}},
                   4);
}

/// Bins that have something in them, at most four decades of them.
struct Shown {
    std::size_t first = DistanceBins::count - 1, last = 0;
};

Shown shownBins(const MeasuredRow& row) {
    constexpr std::size_t most = std::size_t{4} * DistanceBins::perDecade;
    Shown shown;
    for (std::size_t bin = 0; bin < DistanceBins::count; ++bin)
        if (row.before.bins().counts()[bin] + row.after.bins().counts()[bin] > 0) {
            shown.last = bin;
            shown.first = std::min(shown.first, bin);
        }
    shown.first = std::max(shown.first, shown.last >= most ? shown.last - most : 0);
    return shown;
}

// in % of all; the first bar has what is below as well
std::vector<double> heightsOf(const DistanceBins& bins, const Shown& shown) {
    const std::vector<std::uint64_t>& counts = bins.counts();
    const auto sum = [&](std::size_t from, std::size_t to) {
        const auto begin = counts.begin();
        return static_cast<double>(std::accumulate(begin + static_cast<std::ptrdiff_t>(from),
                                                   begin + static_cast<std::ptrdiff_t>(to), std::uint64_t{0}));
    };
    const double all = sum(0, counts.size());
    std::vector<double> heights{100.0 * sum(0, shown.first + 1) / all};
    for (std::size_t bin = shown.first + 1; bin <= shown.last; ++bin)
        heights.push_back(100.0 * sum(bin, bin + 1) / all);
    return heights;
}

std::string histogram(const MeasuredRow& row) {
    const Shown shown = shownBins(row);
    BarChart chart;
    chart.title = "Distances from the target";
    chart.x.scale = {DistanceBins::edge(shown.first), DistanceBins::edge(shown.last + 1), true};
    chart.x.label = "mm (the first bar: and all below)";
    chart.heightLabel = "% of all";
    chart.bars.push_back({"before", "before", heightsOf(row.before.bins(), shown)});
    chart.bars.push_back({"after", "after", heightsOf(row.after.bins(), shown)});
    return svgOf(chart);
}

std::string losses(const TrainingRecord& training) {
    std::vector<Curve> curves{{"training", "training", false, training.training}};
    if (!training.validation.empty())
        curves.push_back({"held out", "validation", false, training.validation});
    const double last = std::max<double>(2.0, static_cast<double>(training.training.size()));
    LineChart chart{"Loss of the training",
                    {{1.0, last}, "epoch"},
                    {logScaleOf({&training.training, &training.validation}), "mean squared error"},
                    std::move(curves)};
    if (training.bestEpoch) {
        chart.mark = static_cast<double>(*training.bestEpoch);
        chart.markName = "best: epoch " + std::to_string(*training.bestEpoch);
    }
    return svgOf(chart);
}

} // namespace

std::string chartsOf(const Row& row) {
    std::string text = overFrames(row.measured) + overVertices(row.measured) + histogram(row.measured);
    if (row.training && !row.training->training.empty())
        text += losses(*row.training);
    return "<div class=\"charts\">\n" + text + "</div>\n";
}

} // namespace quarn
