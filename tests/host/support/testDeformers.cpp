// SPDX-License-Identifier: Apache-2.0
#include "host/support/testDeformers.h"

#include "host/support/attributes.h"
#include "host/support/testNodes.h"

#include "openquarn/HFnDependencyNode.h"
#include "openquarn/HFnMesh.h"

#include <gtest/gtest.h>

namespace testDeformers {
namespace {

using testNodes::text;

HObject pushAttribute;

class TestDeformer : public HPxDeformerNode {
public:
    static HStatus initialize() {
        pushAttribute = testAttributes::real("push", 1.0);
        addAttribute(pushAttribute);
        return attributeAffects(pushAttribute, outputGeom);
    }

    HStatus initializeMultiIndex(HDataBlock& block, unsigned multiIndex, bool reset) override {
        return Hooks::initialize ? Hooks::initialize(*this, block, multiIndex, reset) : HStatus();
    }
    HStatus deform(HDataBlock& block, HItGeometry& iterator, const HMatrix&, unsigned multiIndex) override {
        return Hooks::deform(*this, block, iterator, multiIndex);
    }
};

} // namespace

void registerTypes() {
    Hooks::reset();
    testAttributes::addType<TestDeformer, TestDeformer::initialize, 0x7e570011, HPxNode::kDeformerNode>("testDeformer");
}

namespace {

double pushOf(HDataBlock& block) {
    return block.inputValue(pushAttribute).asDouble() *
           static_cast<double>(block.inputValue(HPxGeometryFilter::envelope).asFloat());
}

} // namespace

HStatus pushPoints(HPxDeformerNode& node, HDataBlock& block, HItGeometry& iterator, unsigned index) {
    const double push = pushOf(block);
    if (push == 0.0)
        return HStatus::kSuccess;
    HStatus status;
    const float* weights = node.envelopeWeights(block, index, &status);
    if (status.error())
        return status;
    HPointArray points;
    status = iterator.allPositions(points);
    for (unsigned i = 0; i < points.length(); ++i)
        points[i].x += push * static_cast<double>(weights ? weights[i] : 1.0F);
    return status.error() ? status : iterator.setAllPositions(points);
}

HStatus pushRawPoints(HPxDeformerNode& node, HDataBlock& block, HItGeometry& iterator, unsigned index) {
    const double push = pushOf(block);
    if (push == 0.0)
        return HStatus::kSuccess;
    const HIndexMapper mapper = node.indexMapper(index);
    const float* weights = node.envelopeWeights(block, index);
    HStatus status;
    const double* from = iterator.rawPositions(&status);
    EXPECT_EQ(text(status), "");
    const std::vector<double> before(from, from + std::size_t{3} * mapper.fullCount());
    double* to = iterator.rawPositionsToSet(&status);
    if (status.error())
        return status;
    for (unsigned i = 0; i < iterator.count(); ++i) {
        const std::size_t at = std::size_t{3} * (mapper.isIdentityMap() ? i : mapper.affectMap()[i]);
        std::copy_n(from + at, 3, to + at);
        to[at] += push * static_cast<double>(weights ? weights[i] : 1.0F);
    }
    EXPECT_EQ(std::vector<double>(from, from + before.size()), before) << "what was read stays";
    EXPECT_EQ(iterator.rawPositions(), to);
    return status;
}

HObject grid(unsigned columns, unsigned rows, double depth) {
    HPointArray points;
    HIntArray counts, connects;
    for (unsigned row = 0; row < rows; ++row)
        for (unsigned column = 0; column < columns; ++column)
            points.append(HPoint(column, row, depth));
    for (unsigned row = 0; row + 1 < rows; ++row)
        for (unsigned column = 0; column + 1 < columns; ++column) {
            const int corner = static_cast<int>(row * columns + column);
            const int above = corner + static_cast<int>(columns);
            counts.append(4);
            for (const int vertex : {corner, corner + 1, above + 1, above})
                connects.append(vertex);
        }
    HStatus status;
    HObject mesh = HFnMeshData().create(points, counts, connects, &status);
    EXPECT_EQ(text(status), "");
    return mesh;
}

HObject withTag(const HObject& mesh, const char* name, const HUintArray& vertices) {
    HFnMeshData data(mesh);
    EXPECT_EQ(text(data.setComponentTag(name, vertices)), "");
    return data.object();
}

HObject meshNode(const std::string& name, const HObject& mesh) {
    HObject node = testNodes::create("mesh", name);
    EXPECT_EQ(text(testNodes::plug(name + ".inMesh").setHObject(mesh)), "");
    return node;
}

std::vector<HPoint> points(const HPlug& plug) {
    HPointArray found;
    const HObject mesh = plug.asHObject();
    if (!mesh.isNull()) {
        EXPECT_EQ(text(HFnMesh(mesh).getPoints(found)), "");
    }
    return {found.begin(), found.end()};
}

std::vector<double> pushed(const HPlug& plug, const HObject& from) {
    HPointArray before;
    EXPECT_EQ(text(HFnMesh(from).getPoints(before)), "");
    std::vector<double> distances;
    for (const HPoint& point : points(plug)) {
        const HPoint& start = before[distances.size()];
        EXPECT_EQ(point.y, start.y);
        EXPECT_EQ(point.z, start.z);
        distances.push_back(point.x - start.x);
    }
    return distances;
}

} // namespace testDeformers
