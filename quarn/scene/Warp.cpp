// SPDX-License-Identifier: Apache-2.0
#include "quarn/scene/Warp.h"

#include "quarn/scene/plugs.h"

#include <stdexcept>

namespace quarn {
namespace {

std::string element(const std::string& array, unsigned index) {
    return array + "[" + std::to_string(index) + "]";
}

WarpGeometry geometryOf(const HObject& node, unsigned index) {
    WarpGeometry geometry;
    geometry.index = index;
    geometry.input = plugOf(node, element("input", index) + ".inputGeometry");
    if (const HPlug source = geometry.input.source(); !source.isNull())
        geometry.input = source;
    geometry.original = plugOf(node, element("originalGeometry", index));
    geometry.output = plugOf(node, element("outputGeom", index));
    geometry.target = sourceOf(node, element("targetGeometry", index));
    const HObject mesh = meshBehind(geometry.input);
    geometry.name = mesh.isNull() ? "geometry" + std::to_string(index) : nodeName(mesh);
    return geometry;
}

template <class Items, class Name>
std::string listed(const Items& items, Name name) {
    std::string text;
    for (const auto& item : items)
        text += (text.empty() ? "" : ", ") + name(item);
    return text;
}

HObject chosenDeformer(const std::string& name) {
    const std::vector<HObject> all = nodesOfType("neuralWarp");
    if (all.empty())
        throw std::runtime_error("the scene has no neuralWarp deformer; quarn import --neural-warp sets one up");
    for (const HObject& node : all)
        if (nodeName(node) == name || (name.empty() && all.size() == 1))
            return node;
    const std::string names = listed(all, nodeName);
    if (name.empty())
        throw std::runtime_error("the scene has several deformers (" + names + "); choose one with --deformer");
    throw std::runtime_error("the scene has no deformer " + name + "; there is " + names);
}

} // namespace

HObject meshBehind(const HPlug& geometry) {
    HPlug plug = geometry;
    for (int steps = 0; steps < 1000 && !plug.isNull(); ++steps) {
        HObject node = plug.node();
        if (nodeType(node) == "mesh" || nodeType(node) == "polyGrid")
            return node;
        if (nodeType(node) == "pointCache")
            plug = sourceOf(node, "inMesh");
        else if (plug.isElement())
            plug = sourceOf(node, element("input", plug.logicalIndex()) + ".inputGeometry");
        else
            break;
    }
    return {};
}

Warp Warp::find(const std::string& name) {
    Warp warp;
    warp.node = chosenDeformer(name);
    warp.name = nodeName(warp.node);
    for (const unsigned index : indicesOf(plugOf(warp.node, "input")))
        warp.geometries.push_back(geometryOf(warp.node, index));
    return warp;
}

const WarpGeometry& Warp::geometry(const std::string& text) const {
    for (const WarpGeometry& geometry : geometries)
        if (geometry.name == text || std::to_string(geometry.index) == text || (text.empty() && geometries.size() == 1))
            return geometry;
    if (geometries.empty())
        throw std::runtime_error(name + " deforms no geometry: connect a mesh into " + name +
                                 ".input[0].inputGeometry");
    const std::string names = listed(geometries, [](const WarpGeometry& geometry) {
        return std::to_string(geometry.index) + " (" + geometry.name + ")";
    });
    if (text.empty())
        throw std::runtime_error(name + " deforms several geometries: " + names + "; choose one with --geometry");
    throw std::runtime_error(name + " deforms no geometry " + text + "; there is " + names);
}

HPlug Warp::plug(const std::string& path) const {
    return plugOf(node, path);
}

HPlug Warp::plug(const std::string& array, const WarpGeometry& geometry, const std::string& child) const {
    return plugOf(node, element(array, geometry.index) + "." + child);
}

} // namespace quarn
