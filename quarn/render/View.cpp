// SPDX-License-Identifier: Apache-2.0
#include "quarn/render/View.h"

#include "quarn/console/UsageError.h"

#include <array>
#include <charconv>
#include <cmath>
#include <numbers>
#include <optional>
#include <stdexcept>
#include <string_view>

namespace quarn {
namespace {

struct Angles {
    double azimuth = 0.0;
    double elevation = 0.0;
};

struct NamedView {
    std::string_view name;
    Angles angles;
};
constexpr std::array<NamedView, 6> namedViews = {{
    {"front", {0.0, 0.0}},
    {"back", {180.0, 0.0}},
    {"right", {90.0, 0.0}},
    {"left", {-90.0, 0.0}},
    {"top", {0.0, 90.0}},
    {"bottom", {0.0, -90.0}},
}};

std::optional<double> wholeNumber(std::string_view text) {
    double value = 0.0;
    const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), value);
    if (error != std::errc() || end != text.data() + text.size() || !std::isfinite(value))
        return {};
    return value;
}

Angles anglesOf(const std::string& direction) {
    for (const NamedView& view : namedViews)
        if (view.name == direction)
            return view.angles;
    const std::size_t comma = direction.find(',');
    if (comma != std::string::npos) {
        const auto azimuth = wholeNumber(std::string_view(direction).substr(0, comma));
        const auto elevation = wholeNumber(std::string_view(direction).substr(comma + 1));
        if (azimuth && elevation && std::abs(*elevation) <= 90.0)
            return {*azimuth, *elevation};
    }
    throw UsageError("\"" + direction + "\" is no view: write front, back, left, right, top, bottom, or " +
                     "AZIMUTH,ELEVATION in degrees, as in 30,15, with an elevation from -90 to 90");
}

// the view of the front
View frontView(const std::string& up) {
    if (up == "y")
        return {{1.0, 0.0, 0.0}, {0.0, 1.0, 0.0}, {0.0, 0.0, 1.0}};
    if (up == "z")
        return {{1.0, 0.0, 0.0}, {0.0, 0.0, 1.0}, {0.0, -1.0, 0.0}};
    if (up == "x")
        return {{0.0, -1.0, 0.0}, {1.0, 0.0, 0.0}, {0.0, 0.0, 1.0}};
    throw UsageError("\"" + up + "\" is no axis that can point up: write x, y or z");
}

} // namespace

View viewFrom(const std::string& direction, const std::string& up) {
    const View front = frontView(up);
    const Angles angles = anglesOf(direction);
    const double azimuth = std::remainder(angles.azimuth, 360.0) * std::numbers::pi / 180.0;
    const double elevation = angles.elevation * std::numbers::pi / 180.0;
    const HVector ahead = front.viewer * std::cos(azimuth) + front.right * std::sin(azimuth);
    View view;
    view.right = front.right * std::cos(azimuth) - front.viewer * std::sin(azimuth);
    view.viewer = ahead * std::cos(elevation) + front.up * std::sin(elevation);
    view.up = front.up * std::cos(elevation) - ahead * std::sin(elevation);
    return view;
}

} // namespace quarn
