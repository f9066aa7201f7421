// SPDX-License-Identifier: Apache-2.0
#include "rig/polyGridNode.h"

#include "openquarn/HFnMesh.h"
#include "openquarn/HFnMeshData.h"
#include "openquarn_helpers/AttributeMaker.h"
#include "openquarn_helpers/guard.h"

#include "rig/Inputs.h"
#include "rig/listChecks.h"
#include "rig/texts.h"

#include <cmath>
#include <cstdint>
#include <string>

namespace rig {

using openquarn_helpers::AttributeMaker;
using openquarn_helpers::guarded;
using openquarn_helpers::outputFlags;

using Node = polyGridNode;

const HTypeId Node::id(0x6e770024);
const HString Node::typeName("polyGrid");

HObject Node::width;
HObject Node::depth;
HObject Node::subdivisionsWidth;
HObject Node::subdivisionsDepth;
HObject Node::outMesh;

polyGridNode::polyGridNode() = default;
polyGridNode::~polyGridNode() = default;

HPxNode* polyGridNode::create() {
    return new (std::nothrow) polyGridNode;
}

HStatus polyGridNode::initialize() {
    constexpr openquarn_helpers::NumberLimits fromOne{.min = 1.0};
    AttributeMaker make;
    width = make.number("width", "w", HFnNumericData::kDouble, 1.0, {}, {.min = 0.0});
    depth = make.number("depth", "d", HFnNumericData::kDouble, 1.0, {}, {.min = 0.0});
    subdivisionsWidth = make.number("subdivisionsWidth", "sw", HFnNumericData::kInt, 10.0, {}, fromOne);
    subdivisionsDepth = make.number("subdivisionsDepth", "sd", HFnNumericData::kInt, 10.0, {}, fromOne);
    outMesh = make.data("outMesh", "om", HFnData::kMesh, outputFlags);
    make.add({width, depth, subdivisionsWidth, subdivisionsDepth, outMesh});
    make.affects({width, depth, subdivisionsWidth, subdivisionsDepth}, {outMesh});
    return make.status();
}

namespace {

struct Grid {
    double width, depth;
    int columns, rows; ///< of quads
};

// what is connected in has not been brought between the limits
HStatus check(const Grid& grid) {
    constexpr std::int64_t mostVertices = std::int64_t{1} << 20U;
    for (const auto& [name, size] : {std::pair<const char*, double>{"width", grid.width}, {"depth", grid.depth}})
        if (!std::isfinite(size) || size < 0.0)
            return wrong(std::string(name) + " is " + text(size) + ", not a finite number from 0 on");
    for (const auto& [name, count] :
         {std::pair<const char*, int>{"subdivisionsWidth", grid.columns}, {"subdivisionsDepth", grid.rows}})
        if (count < 1)
            return wrong(std::string(name) + " is " + std::to_string(count) + ", not 1 or more");
    const std::int64_t columns = std::int64_t{grid.columns} + 1, rows = std::int64_t{grid.rows} + 1;
    if (columns > mostVertices || rows > mostVertices || columns * rows > mostVertices)
        return wrong("subdivisionsWidth " + std::to_string(grid.columns) + " and subdivisionsDepth " +
                     std::to_string(grid.rows) + " make more than " + std::to_string(mostVertices) + " vertices");
    return HStatus::kSuccess;
}

HPointArray pointsOf(const Grid& grid) {
    HPointArray points(static_cast<unsigned>((grid.columns + 1) * (grid.rows + 1)));
    unsigned vertex = 0;
    for (int row = 0; row <= grid.rows; ++row)
        for (int column = 0; column <= grid.columns; ++column)
            points[vertex++] = HPoint(grid.width * (static_cast<double>(column) / grid.columns - 0.5), 0.0,
                                      grid.depth * (static_cast<double>(row) / grid.rows - 0.5));
    return points;
}

HIntArray cornersOf(const Grid& grid) {
    HIntArray corners(static_cast<unsigned>(4 * grid.columns * grid.rows));
    unsigned at = 0;
    for (int row = 0; row < grid.rows; ++row)
        for (int column = 0; column < grid.columns; ++column) {
            const int first = row * (grid.columns + 1) + column, below = first + grid.columns + 1;
            for (const int corner : {first, below, below + 1, first + 1})
                corners[at++] = corner;
        }
    return corners;
}

// seen from above, u goes to the right and v up: it is 1 in the first row
HStatus addUvs(const Grid& grid, const HIntArray& corners, HObject& mesh) {
    HFloatArray us(static_cast<unsigned>((grid.columns + 1) * (grid.rows + 1))), vs(us.length());
    unsigned vertex = 0;
    for (int row = 0; row <= grid.rows; ++row)
        for (int column = 0; column <= grid.columns; ++column) {
            us[vertex] = static_cast<float>(static_cast<double>(column) / grid.columns);
            vs[vertex++] = static_cast<float>(1.0 - static_cast<double>(row) / grid.rows);
        }
    HFnMesh set(mesh);
    const HStatus status = set.setUVs(us, vs, corners);
    mesh = set.object();
    return status;
}

HStatus makeMesh(const Grid& grid, HObject& mesh) {
    HStatus status = check(grid);
    if (status.error())
        return status;
    HIntArray counts(static_cast<unsigned>(grid.columns * grid.rows));
    for (int& count : counts)
        count = 4;
    const HIntArray corners = cornersOf(grid);
    mesh = HFnMeshData().create(pointsOf(grid), counts, corners, &status);
    return status.error() ? status : addUvs(grid, corners, mesh);
}

} // namespace

HStatus polyGridNode::compute(const HPlug& plug, HDataBlock& block) {
    return guarded([&]() -> HStatus {
        if (plug.attribute() != outMesh)
            return HStatus::kUnknownParameter;
        Inputs inputs(block);
        const Grid grid{inputs.number(width), inputs.number(depth), inputs.integer(subdivisionsWidth),
                        inputs.integer(subdivisionsDepth)};
        HObject mesh;
        HStatus status = inputs.status().error() ? inputs.status() : makeMesh(grid, mesh);
        if (!status.error())
            status = block.outputValue(outMesh).set(mesh);
        return status.error() ? status : block.setClean(plug);
    });
}

} // namespace rig
