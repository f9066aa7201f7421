// SPDX-License-Identifier: Apache-2.0
#include "quarn/scene/shapes.h"

#include "openquarn/HFnData.h"
#include "quarn/scene/Warp.h"
#include "quarn/scene/meshes.h"
#include "quarn/scene/plugs.h"
#include "quarn/scene/sliders.h"

#include <algorithm>
#include <stdexcept>

namespace quarn {
namespace {

std::string element(const char* array, unsigned index) {
    return std::string(array) + "[" + std::to_string(index) + "]";
}

std::vector<double> listOf(const HObject& node, const std::string& path) {
    return HFnDoubleArrayData(plugOf(node, path).asHObject()).values();
}

void readDeltas(const HObject& node, const std::string& path, std::size_t vertices, rig::ShapeDeltas& deltas) {
    const HStatus status =
        rig::makeShapeDeltas(listOf(node, path + ".vertices"), listOf(node, path + ".deltas"), deltas);
    if (status.error())
        throw std::runtime_error(nodeName(node) + "." + path + ": " + status.errorString().asChar());
    if (deltas.extent() > vertices)
        throw std::runtime_error(nodeName(node) + "." + path + " moves vertex " + std::to_string(deltas.extent() - 1) +
                                 " of a mesh of " + std::to_string(vertices));
}

// what stands behind the node and the dot
std::string ownName(const HPlug& slider) {
    const std::string name = sliderName(slider);
    return name.substr(name.find('.') + 1);
}

SceneShapes::Shape shapeOf(const HObject& node, unsigned geometry, unsigned index, std::size_t vertices) {
    SceneShapes::Shape shape;
    shape.name = "shape" + std::to_string(index);
    shape.weight = plugOf(node, element("weight", index));
    shape.control = shape.weight;
    if (const HPlug slider = sliderBehind(shape.weight.source()); !slider.isNull()) {
        shape.name = ownName(slider);
        shape.control = valueOf(slider);
        shape.restWeight = numberOf(findPlug(std::string(slider.name().asChar()) + ".defaultValue"));
    }
    shape.deltas = shapeDeltas(node, geometry, index, vertices);
    return shape;
}

void addShapes(const HObject& node, unsigned geometry, std::vector<SceneShapes>& all) {
    SceneShapes shapes;
    shapes.input = plugOf(node, element("input", geometry) + ".inputGeometry");
    const HPlug source = shapes.input.source();
    const HObject mesh = source.isNull() ? HObject() : meshBehind(source);
    if (mesh.isNull() || mesh != source.node())
        return;
    shapes.mesh = nodeName(mesh);
    shapes.output = plugOf(node, element("outputGeom", geometry));
    const std::size_t vertices = vertexCountOf(shapes.input);
    for (const unsigned index : indicesOf(plugOf(node, "weight")))
        shapes.shapes.push_back(shapeOf(node, geometry, index, vertices));
    if (vertices > 0 && !shapes.shapes.empty())
        all.push_back(std::move(shapes));
}

} // namespace

std::vector<SceneShapes> sceneShapes() {
    std::vector<SceneShapes> all;
    for (const HObject& node : nodesOfType("blendShape"))
        if (indicesOf(plugOf(node, "combination")).empty())
            for (const unsigned geometry : indicesOf(plugOf(node, "input")))
                addShapes(node, geometry, all);
    return all;
}

rig::ShapeDeltas shapeDeltas(const HObject& node, unsigned geometry, unsigned index, std::size_t vertices) {
    rig::ShapeDeltas deltas;
    const std::string lists = element("shapes", geometry) + ".shape";
    const std::vector<unsigned> known = indicesOf(plugOf(node, lists));
    if (std::find(known.begin(), known.end(), index) != known.end())
        readDeltas(node, lists + "[" + std::to_string(index) + "]", vertices, deltas);
    return deltas;
}

} // namespace quarn
