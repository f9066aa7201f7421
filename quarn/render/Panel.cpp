// SPDX-License-Identifier: Apache-2.0
#include "quarn/render/Panel.h"

#include "quarn/render/heat.h"
#include "quarn/scene/plugs.h"

#include <cmath>
#include <stdexcept>
#include <utility>

namespace quarn {
namespace {

constexpr double farthest = 1e15; // squares and cubes of it stay far from the largest float

std::pair<std::string, std::string> splitPanel(const std::string& text, const std::string& form) {
    const std::size_t equals = text.rfind('=');
    if (equals == std::string::npos || equals + 1 == text.size())
        throw std::runtime_error("\"" + text + "\" is no panel: write " + form);
    return {text.substr(0, equals), text.substr(equals + 1)};
}

std::string nameOf(const HPlug& plug) {
    return plug.name().asChar();
}

} // namespace

Panel panelFrom(const std::string& text) {
    const auto [label, plug] = splitPanel(text, "LABEL=PLUG");
    return {label, findPlug(plug), HPlug()};
}

Panel heatPanelFrom(const std::string& text) {
    const std::string form = "LABEL=PLUG:PLUG";
    const auto [label, plugs] = splitPanel(text, form);
    const std::size_t colon = plugs.find(':');
    if (colon == std::string::npos || colon == 0 || colon + 1 == plugs.size())
        throw std::runtime_error("\"" + text + "\" is no heat panel: write " + form);
    return {label, findPlug(plugs.substr(0, colon)), findPlug(plugs.substr(colon + 1))};
}

void requireDrawable(std::span<const double> xyz, const std::string& plug, int frame) {
    for (std::size_t at = 0; at < xyz.size(); ++at)
        if (!(std::abs(xyz[at]) <= farthest))
            throw std::runtime_error(
                plug + " cannot be drawn at frame " + std::to_string(frame) + ": its vertex " + std::to_string(at / 3) +
                (std::isfinite(xyz[at]) ? " is too far away" : " has a position that is no number"));
}

PanelFrame evaluatePanel(const Panel& panel, int frame) {
    PanelFrame result;
    result.polygons = polygonsOf(panel.mesh);
    readPoints(panel.mesh, result.points);
    requireDrawable(result.points, nameOf(panel.mesh), frame);
    if (!panel.isHeat())
        return result;
    std::vector<double> reference;
    readPoints(panel.reference, reference);
    requireDrawable(reference, nameOf(panel.reference), frame);
    if (reference.size() != result.points.size())
        throw std::runtime_error("the distance of " + nameOf(panel.mesh) + " from " + nameOf(panel.reference) +
                                 " cannot be shown: they have " + std::to_string(result.points.size() / 3) + " and " +
                                 std::to_string(reference.size() / 3) + " vertices");
    result.distances = distances(result.points, reference);
    return result;
}

} // namespace quarn
