// SPDX-License-Identifier: Apache-2.0
#include "quarn/report/charts.h"

#include "quarn/console/numberText.h"
#include "quarn/report/escaped.h"

#include <algorithm>
#include <cmath>

namespace quarn {
namespace {

// the picture, and the plot in it
constexpr double width = 560, height = 300, left = 64, right = 548, top = 56, bottom = 254;
constexpr std::size_t mostColumns = 480;

std::string coordinate(double value) {
    return numberText(std::round(value * 10.0) / 10.0);
}

std::string attribute(const char* name, const std::string& value) {
    return std::string(" ") + name + "=\"" + escaped(value) + "\"";
}

std::string line(double x1, double y1, double x2, double y2, const std::string& kind) {
    return "<line" + attribute("x1", coordinate(x1)) + attribute("y1", coordinate(y1)) +
           attribute("x2", coordinate(x2)) + attribute("y2", coordinate(y2)) + attribute("class", kind) + "/>\n";
}

std::string textAt(double x, double y, const char* anchor, const std::string& text, const char* kind = "label") {
    return "<text" + attribute("x", coordinate(x)) + attribute("y", coordinate(y)) + attribute("text-anchor", anchor) +
           attribute("class", kind) + ">" + escaped(text) + "</text>\n";
}

double xOf(const Scale& scale, double value) {
    return left + (right - left) * scale.place(value);
}
double yOf(const Scale& scale, double value) {
    return bottom - (bottom - top) * scale.place(value);
}

std::string begin(const std::string& title) {
    return "<svg xmlns=\"http://www.w3.org/2000/svg\" class=\"chart\" role=\"img\" viewBox=\"0 0 " + coordinate(width) +
           " " + coordinate(height) + "\"" + attribute("aria-label", title) + ">\n" +
           textAt(left, 18, "start", title, "title");
}

std::string axes(const Axis& x, const Scale& y, const std::string& yLabel) {
    std::string text;
    for (const double tick : y.ticks())
        text += line(left, yOf(y, tick), right, yOf(y, tick), "grid") +
                textAt(left - 6, yOf(y, tick) + 4, "end", numberText(tick));
    for (const double tick : x.scale.ticks())
        text += line(xOf(x.scale, tick), bottom, xOf(x.scale, tick), bottom + 4, "axis") +
                textAt(xOf(x.scale, tick), bottom + 18, "middle", numberText(tick));
    return text + line(left, bottom, right, bottom, "axis") +
           textAt((left + right) / 2, height - 8, "middle", x.label) + "<text transform=\"translate(14 " +
           coordinate((top + bottom) / 2) + ") rotate(-90)\" text-anchor=\"middle\" class=\"label\">" +
           escaped(yLabel) + "</text>\n";
}

/// Names of what is drawn, from left to right.
class Legend {
public:
    void add(const std::string& name, const std::string& kind) {
        text_ += line(x_, 36, x_ + 20, 36, kind) + textAt(x_ + 25, 40, "start", name);
        x_ += 37 + 6.0 * static_cast<double>(name.size());
    }
    const std::string& text() const { return text_; }

private:
    double x_ = left;
    std::string text_;
};

std::string kindOf(const Curve& curve) {
    return "curve " + curve.kind + (curve.isDashed ? " dashed" : "");
}

// the largest of each column; never fewer than two points, so that there is a line
std::string points(const Curve& curve, const Scale& y) {
    const std::size_t count = curve.y.size(), columns = std::min(count, mostColumns);
    std::string text;
    for (std::size_t column = 0; column < columns; ++column) {
        const auto from = curve.y.begin() + static_cast<std::ptrdiff_t>(column * count / columns);
        const auto to = curve.y.begin() + static_cast<std::ptrdiff_t>((column + 1) * count / columns);
        const double part = columns > 1 ? static_cast<double>(column) / static_cast<double>(columns - 1) : 0.0;
        text += coordinate(left + (right - left) * part) + "," + coordinate(yOf(y, *std::max_element(from, to))) + " ";
    }
    if (columns == 1)
        text += coordinate(right) + "," + coordinate(yOf(y, curve.y.front()));
    return text;
}

std::string rectangles(const Bars& bars, const Scale& y) {
    const double step = (right - left) / static_cast<double>(bars.heights.size());
    std::string text;
    for (std::size_t i = 0; i < bars.heights.size(); ++i)
        if (bars.heights[i] > 0.0)
            text += "<rect" + attribute("x", coordinate(left + step * static_cast<double>(i))) +
                    attribute("y", coordinate(yOf(y, bars.heights[i]))) + attribute("width", coordinate(step)) +
                    attribute("height", coordinate(bottom - yOf(y, bars.heights[i]))) +
                    attribute("class", "bar " + bars.kind) + "/>\n";
    return text;
}

// a step of 1, 2 or 5 times a power of ten, at most six of which are in the range
double stepOf(double range) {
    const double rough = range / 6.0, power = std::pow(10.0, std::floor(std::log10(rough)));
    for (const double factor : {1.0, 2.0, 5.0})
        if (factor * power >= rough * (1.0 - 1e-9))
            return factor * power;
    return 10.0 * power;
}

} // namespace

double Scale::place(double value) const {
    if (isLog)
        return value > first ? std::min(1.0, std::log(value / first) / std::log(last / first)) : 0.0;
    return std::clamp((value - first) / (last - first), 0.0, 1.0);
}

std::vector<double> Scale::ticks() const {
    std::vector<double> ticks;
    constexpr double slack = 1e-9;
    if (!isLog) {
        const double step = stepOf(last - first);
        for (double number = std::ceil(first / step - slack); number * step <= last + slack * step; ++number)
            ticks.push_back(number * step + 0.0); // never -0
        return ticks;
    }
    const double decades = std::log10(last / first);
    for (double power = std::floor(std::log10(first) + slack); power <= std::log10(last) + slack; ++power)
        for (const double factor : {1.0, 2.0, 5.0})
            if (const double tick = factor * std::pow(10.0, power);
                (factor == 1.0 || decades < 2.5) && tick >= first * (1.0 - slack) && tick <= last * (1.0 + slack))
                ticks.push_back(tick);
    return ticks;
}

Scale logScaleOf(const std::vector<const std::vector<double>*>& values, int decades) {
    double least = 0.0, most = 0.0;
    for (const std::vector<double>* list : values)
        for (const double value : *list)
            if (value > 0.0) {
                least = least > 0.0 ? std::min(least, value) : value;
                most = std::max(most, value);
            }
    if (most == 0.0)
        return {0.1, 1.0, true};
    const double last = std::ceil(std::log10(most) - 1e-9);
    const double first = std::max(std::floor(std::log10(least) + 1e-9), last - decades);
    return {std::pow(10.0, std::min(first, last - 1.0)), std::pow(10.0, last), true};
}

std::string svgOf(const LineChart& chart) {
    std::string text = begin(chart.title) + axes(chart.x, chart.y.scale, chart.y.label);
    Legend legend;
    if (chart.mark) {
        const double x = xOf(chart.x.scale, *chart.mark);
        text += line(x, top, x, bottom, "mark");
    }
    for (const Curve& curve : chart.curves) {
        text += "<polyline" + attribute("points", points(curve, chart.y.scale)) + attribute("class", kindOf(curve)) +
                "/>\n";
        legend.add(curve.name, kindOf(curve));
    }
    if (chart.mark)
        legend.add(chart.markName, "mark");
    return text + legend.text() + "</svg>\n";
}

std::string svgOf(const BarChart& chart) {
    double most = 0.0;
    for (const Bars& bars : chart.bars)
        most = std::max(most, bars.heights.empty() ? 0.0 : *std::max_element(bars.heights.begin(), bars.heights.end()));
    const Scale y{0.0, most > 0.0 ? most * 1.05 : 1.0, false};
    std::string text = begin(chart.title) + axes(chart.x, y, chart.heightLabel);
    Legend legend;
    for (const Bars& bars : chart.bars) {
        text += rectangles(bars, y);
        legend.add(bars.name, "curve " + bars.kind);
    }
    return text + legend.text() + "</svg>\n";
}

} // namespace quarn
