// SPDX-License-Identifier: Apache-2.0
// Charts as SVG that stands in a page: colours come from the page's style, by class.
#pragma once

#include <optional>
#include <string>
#include <vector>

namespace quarn {

/// Of a scale: where it begins and ends, and whether equal steps are equal factors.
struct Scale {
    double first = 0.0, last = 1.0; ///< first < last; above 0 where it is logarithmic
    bool isLog = false;
    /// 0 at the first, 1 at the last; values beyond stand at the ends.
    double place(double value) const;
    /// Round numbers within it: 1, 2 and 5 times powers of ten, of a long logarithmic one the powers alone.
    std::vector<double> ticks() const;
};

/// Logarithmic, from a power of ten to one, and around the values that are above 0; over at most `decades`. 0.1 to 1
/// where there is no such value.
Scale logScaleOf(const std::vector<const std::vector<double>*>& values, int decades = 6);

struct Axis {
    Scale scale;
    std::string label;
};

struct Curve {
    std::string name; ///< in the legend
    std::string kind; ///< its class: "before", "after", "training", "validation"
    bool isDashed = false;
    std::vector<double> y; ///< at equal steps of x, from its first to its last value; one or more
};

struct LineChart {
    std::string title;
    Axis x, y;
    std::vector<Curve> curves;
    std::optional<double> mark{}; ///< a line across, at this x
    std::string markName{};
};

struct Bars {
    std::string name, kind;
    std::vector<double> heights; ///< of bars of equal widths on the axis, side by side
};

struct BarChart {
    std::string title;
    Axis x;
    std::string heightLabel;
    std::vector<Bars> bars; ///< over each other; equally many heights
};

/// One <svg> element, well-formed XML. Of more values than there are columns in the picture the largest are drawn.
std::string svgOf(const LineChart& chart);
std::string svgOf(const BarChart& chart);

} // namespace quarn
