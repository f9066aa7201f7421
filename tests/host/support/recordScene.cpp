// SPDX-License-Identifier: Apache-2.0
#include "host/support/recordScene.h"

#include "openquarn/HDGModifier.h"
#include "openquarn/HFnDependencyNode.h"
#include "openquarn/HFnMeshData.h"
#include "openquarn/HPxDeformerNode.h"

#include <array>
#include <cmath>
#include <random>
#include <stdexcept>
#include <utility>

namespace recordScene {
namespace {

void check(const HStatus& status) {
    if (status.error())
        throw std::runtime_error(status.errorString().asStdString());
}

// std::shuffle and the distributions differ from library to library
unsigned below(std::mt19937& random, unsigned limit) {
    return static_cast<unsigned>((std::uint64_t{random()} * limit) >> 32);
}

class Polygons {
public:
    explicit Polygons(unsigned columns)
        : columns_(columns) {}

    void add(std::initializer_list<std::pair<unsigned, unsigned>> corners) {
        counts.append(static_cast<int>(corners.size()));
        for (const auto& [column, row] : corners)
            connects.append(static_cast<int>(row * columns_ + column));
    }
    /// A polygon over `width` cells in a row.
    void addStrip(unsigned c, unsigned r, unsigned width) {
        counts.append(static_cast<int>(2 * width + 2));
        for (unsigned i = 0; i <= width; ++i)
            connects.append(static_cast<int>(r * columns_ + c + i));
        for (unsigned i = 0; i <= width; ++i)
            connects.append(static_cast<int>((r + 1) * columns_ + c + width - i));
    }

    HIntArray counts, connects;

private:
    unsigned columns_;
};

Polygons polygons(unsigned columns, unsigned rows, std::mt19937& random) {
    Polygons made(columns);
    for (unsigned r = 0; r + 1 < rows; ++r)
        for (unsigned c = 0; c + 1 < columns;) {
            const bool inLargeHole = c > columns / 4 && c < columns / 2 && r > rows / 4 && r < rows / 2;
            const unsigned kind = below(random, 16);
            if (inLargeHole || kind == 0) { // nothing here
                ++c;
            } else if (kind == 1) {
                made.add({{c, r}, {c + 1, r}, {c + 1, r + 1}});
                made.add({{c, r}, {c + 1, r + 1}, {c, r + 1}});
                ++c;
            } else {
                const unsigned width = std::min(kind < 4 ? kind : 1U, columns - 1 - c);
                made.addStrip(c, r, width);
                c += width;
            }
        }
    return made;
}

HPointArray heightField(unsigned columns, unsigned rows) {
    HPointArray points(columns * rows);
    for (unsigned i = 0; i < points.length(); ++i) {
        const double x = i % columns, y = i / columns; // NOLINT(bugprone-integer-division): the row
        points[i] = HPoint(0.1 * x, 0.1 * y, std::sin(0.31 * x) * std::cos(0.17 * y));
    }
    return points;
}

HUintArray shuffledPatch(unsigned vertices, std::mt19937& random) {
    HUintArray all(vertices);
    for (unsigned i = 0; i < vertices; ++i)
        all[i] = i;
    const unsigned wanted = vertices * 2 / 5;
    for (unsigned i = 0; i < wanted; ++i)
        std::swap(all[i], all[i + below(random, vertices - i)]);
    check(all.setLength(wanted));
    return all;
}

HPlug element(const HObject& node, const HObject& attribute, unsigned index) {
    return HPlug(node, attribute).elementByLogicalIndex(index);
}

void setWeights(const HObject& deformer, unsigned geometry, unsigned vertices, unsigned step) {
    const HPlug weights = element(deformer, HPxDeformerNode::weightList, geometry).child(HPxDeformerNode::weights);
    for (unsigned vertex = 0; vertex < vertices; vertex += step)
        check(weights.elementByLogicalIndex(vertex).setDouble(0.25 + 0.5 * (vertex % 7) / 7.0));
}

void connect(const HPlug& source, const HPlug& destination) {
    HDGModifier modifier;
    check(modifier.connect(source, destination));
    check(modifier.doIt());
}

HObject create(const std::string& type, const std::string& name) {
    HStatus status;
    HObject node = HFnDependencyNode().create(type, name, &status);
    check(status);
    return node;
}

HPlug inputOf(const HObject& deformer, unsigned geometry) {
    return element(deformer, HPxGeometryFilter::input, geometry).child(HPxGeometryFilter::inputGeometry);
}

} // namespace

HObject mesh(unsigned columns, unsigned rows, unsigned seed) {
    std::mt19937 random(seed);
    const Polygons made = polygons(columns, rows, random);
    HStatus status;
    HFnMeshData data;
    data.create(heightField(columns, rows), made.counts, made.connects, &status);
    check(status);
    check(data.setComponentTag("patch", shuffledPatch(columns * rows, random)));
    return data.object();
}

Scene build(const std::string& firstType, const std::string& secondType) {
    constexpr std::array<std::array<unsigned, 3>, 3> sizes = {{{32, 32, 0}, {142, 141, 1}, {316, 317, 4}}};
    Scene scene;
    scene.first = create(firstType, "firstDeformer");
    scene.second = create(secondType, "secondDeformer");
    for (const auto& [columns, rows, geometry] : sizes) {
        const HObject node = create("mesh", "recordMesh" + std::to_string(geometry));
        check(HFnDependencyNode(node).findPlug("inMesh").setHObject(mesh(columns, rows, geometry + 1)));
        const HPlug held = HFnDependencyNode(node).findPlug("outMesh");
        connect(held, inputOf(scene.first, geometry));
        connect(element(scene.first, HPxGeometryFilter::outputGeom, geometry), inputOf(scene.second, geometry));
        for (const HObject& deformer : {scene.first, scene.second}) {
            connect(held, element(deformer, HPxGeometryFilter::originalGeometry, geometry));
            if (geometry == 1)
                check(element(deformer, HPxGeometryFilter::input, geometry)
                          .child(HPxGeometryFilter::componentTagExpression)
                          .setString("patch"));
        }
        scene.meshes.push_back(node);
        scene.geometries.push_back(geometry);
        scene.outputs.push_back(element(scene.second, HPxGeometryFilter::outputGeom, geometry));
    }
    setWeights(scene.first, 4, 316 * 317, 3);
    setWeights(scene.second, 4, 316 * 317, 5);
    return scene;
}

} // namespace recordScene
