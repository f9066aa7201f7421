// SPDX-License-Identifier: Apache-2.0
#include "quarn/scene/meshSum.h"

#include "quarn/scene/meshes.h"

#include "openquarn/HPlug.h"
#include "storage/ByteSum.h"

#include <cstdint>
#include <span>
#include <vector>

namespace quarn {

std::string meshSum(const HPlug& mesh) {
    const MeshPolygons polygons = polygonsOf(mesh);
    std::vector<float> points;
    readPoints(mesh, points);
    for (float& number : points)
        number += 0.0F; // -0 is 0
    const std::uint64_t counts[] = {polygons.vertexCount, polygons.sizes.size()};
    storage::ByteSum sum;
    sum.add(std::as_bytes(std::span(counts)));
    sum.add(std::as_bytes(std::span(polygons.sizes)));
    sum.add(std::as_bytes(std::span(polygons.corners)));
    sum.add(std::as_bytes(std::span(points)));
    return "xxh3_128:" + sum.digits();
}

} // namespace quarn
