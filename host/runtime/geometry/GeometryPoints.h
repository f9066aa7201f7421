// SPDX-License-Identifier: Apache-2.0
// The points that an iterator reads and writes.
#pragma once

#include "geometry/IndexMap.h"
#include "graph/Slot.h"
#include "openquarn/HPoint.h"

namespace OpenQuarn {

/// A mesh, or the affected vertices of it. Its points are copied when the first of them is written.
class GeometryPoints {
public:
    /// `map` null: all vertices. `pool` where new points come from; may be null.
    GeometryPoints(std::shared_ptr<MeshData> mesh, std::shared_ptr<const IndexMap> map,
                   std::shared_ptr<PositionPool> pool);

    unsigned count() const { return map_ ? map_->affectCount() : mesh_->vertexCount(); }
    unsigned fullIndex(unsigned position) const { return map_ ? map_->fullIndex(position) : position; }
    /// `position` below count().
    HPoint point(unsigned position) const;
    /// Of all vertices.
    const double* raw() const { return current().xyz(); }
    /// Of all vertices, to be written: those that are visited by the caller, in full; the others have their points.
    double* rawToSet() { return writable(!isWhole()); }
    void setPoint(unsigned position, const HPoint& point);
    HStatus copyTo(HPointArray& points) const;
    /// count() points.
    void copyFrom(const HPointArray& points);
    bool isWritten() const { return written_ != nullptr; }
    /// The mesh with the points that were written, which is what is read from now on.
    const std::shared_ptr<MeshData>& result();

    std::shared_ptr<Slot> slot; ///< the value that the result belongs into; null for none

private:
    bool isWhole() const { return !map_ || map_->isIdentity(); }
    const Positions& current() const { return written_ ? *written_ : *mesh_->points; }
    /// To write to. `keep` false when all vertices will be written.
    double* writable(bool keep);

    std::shared_ptr<MeshData> mesh_;
    const std::shared_ptr<const IndexMap> map_;
    const std::shared_ptr<PositionPool> pool_;
    std::shared_ptr<Positions> written_;
};

} // namespace OpenQuarn
