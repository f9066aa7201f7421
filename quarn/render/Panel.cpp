// SPDX-License-Identifier: Apache-2.0
#include "quarn/render/Panel.h"

#include "quarn/render/heat.h"
#include "quarn/scene/plugs.h"

#include <algorithm>
#include <cmath>
#include <functional>
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

std::vector<std::string> parts(const std::string& text, char separator) {
    std::vector<std::string> result;
    std::size_t begin = 0;
    for (std::size_t end = 0; end != std::string::npos; begin = end + 1) {
        end = text.find(separator, begin);
        result.push_back(text.substr(begin, end - begin));
    }
    return result;
}

MeshFrame evaluateMesh(const PanelMesh& shown, int frame) {
    MeshFrame result;
    result.polygons = polygonsOf(shown.mesh);
    readPoints(shown.mesh, result.points);
    requireDrawable(result.points, nameOf(shown.mesh), frame);
    if (shown.reference.isNull())
        return result;
    std::vector<double> reference;
    readPoints(shown.reference, reference);
    requireDrawable(reference, nameOf(shown.reference), frame);
    if (reference.size() != result.points.size())
        throw std::runtime_error("the distance of " + nameOf(shown.mesh) + " from " + nameOf(shown.reference) +
                                 " cannot be shown: they have " + std::to_string(result.points.size() / 3) + " and " +
                                 std::to_string(reference.size() / 3) + " vertices");
    result.distances = distances(result.points, reference);
    return result;
}

} // namespace

bool Panel::isHeat() const {
    return std::any_of(meshes.begin(), meshes.end(), [](const PanelMesh& mesh) { return !mesh.reference.isNull(); });
}

Panel panelFrom(const std::string& text) {
    const auto [label, plugs] = splitPanel(text, "LABEL=PLUG, with several as PLUG+PLUG");
    Panel panel{label, {}};
    for (const std::string& plug : parts(plugs, '+'))
        panel.meshes.push_back({findPlug(plug), HPlug()});
    return panel;
}

Panel heatPanelFrom(const std::string& text) {
    const std::string form = "LABEL=PLUG:PLUG, with several as PLUG:PLUG+PLUG:PLUG";
    const auto [label, plugs] = splitPanel(text, form);
    Panel panel{label, {}};
    for (const std::string& pair : parts(plugs, '+')) {
        const std::vector<std::string> both = parts(pair, ':');
        if (both.size() > 2 || std::any_of(both.begin(), both.end(), std::mem_fn(&std::string::empty)))
            throw std::runtime_error("\"" + text + "\" is no heat panel: write " + form);
        panel.meshes.push_back({findPlug(both[0]), both.size() == 2 ? findPlug(both[1]) : HPlug()});
    }
    if (!panel.isHeat())
        throw std::runtime_error("\"" + text + "\" is no heat panel: write " + form);
    return panel;
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
    for (const PanelMesh& mesh : panel.meshes)
        result.push_back(evaluateMesh(mesh, frame));
    return result;
}

} // namespace quarn
