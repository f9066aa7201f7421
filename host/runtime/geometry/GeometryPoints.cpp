// SPDX-License-Identifier: Apache-2.0
#include "geometry/GeometryPoints.h"

#include "geometry/forRanges.h"

#include <algorithm>

namespace OpenQuarn {

GeometryPoints::GeometryPoints(std::shared_ptr<MeshData> mesh, std::shared_ptr<const IndexMap> map,
                               std::shared_ptr<PositionPool> pool)
    : mesh_(std::move(mesh))
    , map_(std::move(map))
    , pool_(std::move(pool)) {}

double* GeometryPoints::writable(bool keep) {
    if (written_)
        return written_->xyz();
    const Positions& present = *mesh_->points;
    std::shared_ptr<Positions> made = pool_ ? pool_->take(present.vertexCount()) : newPositions(present.vertexCount());
    if (keep)
        forRanges(present.vertexCount(), [&, to = made->xyz()](std::size_t begin, std::size_t end) {
            std::copy(present.xyz() + 3 * begin, present.xyz() + 3 * end, to + 3 * begin);
        });
    written_ = std::move(made);
    return written_->xyz();
}

HPoint GeometryPoints::point(unsigned position) const {
    const double* xyz = current().xyz() + std::size_t{3} * fullIndex(position);
    return {xyz[0], xyz[1], xyz[2]};
}

void GeometryPoints::setPoint(unsigned position, const HPoint& point) {
    double* xyz = writable(true) + std::size_t{3} * fullIndex(position);
    xyz[0] = point.x;
    xyz[1] = point.y;
    xyz[2] = point.z;
}

HStatus GeometryPoints::copyTo(HPointArray& points) const {
    if (isWhole())
        return copyPoints(current(), points);
    if (HStatus status = points.setLength(count()); status.error())
        return status;
    const double* all = current().xyz();
    forRanges(points.length(), [&](std::size_t begin, std::size_t end) {
        for (std::size_t i = begin; i < end; ++i) {
            const double* xyz = all + std::size_t{3} * (*map_->affected)[i];
            points[i] = HPoint(xyz[0], xyz[1], xyz[2]);
        }
    });
    return HStatus::kSuccess;
}

void GeometryPoints::copyFrom(const HPointArray& points) {
    const bool whole = isWhole();
    double* xyz = writable(!whole);
    forRanges(points.length(), [&](std::size_t begin, std::size_t end) {
        for (std::size_t i = begin; i < end; ++i) {
            double* to = xyz + std::size_t{3} * (whole ? i : (*map_->affected)[i]);
            to[0] = points[i].x;
            to[1] = points[i].y;
            to[2] = points[i].z;
        }
    });
}

const std::shared_ptr<MeshData>& GeometryPoints::result() {
    if (written_) {
        mesh_ = mesh_->withPositions(written_);
        written_.reset();
    }
    return mesh_;
}

} // namespace OpenQuarn
