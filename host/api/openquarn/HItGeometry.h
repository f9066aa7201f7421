// SPDX-License-Identifier: Apache-2.0
// The points of a geometry, one by one or all at once.
#pragma once

#include "openquarn/HDataBlock.h"
#include "openquarn/HPointArray.h"
#include "openquarn/HSpace.h"

#include <memory>

namespace OpenQuarn {
class GeometryPoints;
} // namespace OpenQuarn

/// Made on a data handle, it visits all vertices in their order; the one that deform() gets visits the vertices that
/// the deformer affects, in the order of its index mapper. Meshes have no transformation, so that every space but
/// HSpace::kInvalid is object space. One iterator is for one thread at a time. [eval] throughout.
class OPENQUARN_API HItGeometry {
public:
    /// `geometry` a handle on a mesh. Points that are set come into the value of the handle as a new mesh, as
    /// HDataHandle::set() would write it: at once with setAllPositions(), when the iterator is destroyed at the latest
    /// with setPosition(). Fails with kInvalidParameter, and visits nothing, when the handle holds no mesh.
    explicit HItGeometry(const HDataHandle& geometry, HStatus* status = nullptr);
    ~HItGeometry();
    HItGeometry(const HItGeometry&) = delete;
    HItGeometry& operator=(const HItGeometry&) = delete;

    /// Number of vertices that it visits.
    unsigned count() const { return count_; }
    bool isDone() const { return current_ >= count_; }
    void next() { ++current_; }
    /// Goes back to the first vertex.
    void reset() { current_ = 0; }
    /// Index, in the whole geometry, of the vertex it stands on; count() or more beyond the last.
    unsigned index() const;

    /// Position of the vertex it stands on, w = 1. Fails beyond the last, and for HSpace::kInvalid.
    HPoint position(HSpace::Space space = HSpace::kObject, HStatus* status = nullptr) const;
    /// Fails as position() does; w is dropped.
    HStatus setPosition(const HPoint& point, HSpace::Space space = HSpace::kObject);

    /// Positions of the count() vertices in the order of iteration, wherever it stands; `points` is replaced. An array
    /// that has the right length already is written in place.
    HStatus allPositions(HPointArray& points, HSpace::Space space = HSpace::kObject) const;
    /// x, y and z of every vertex of the whole geometry, in its own order whatever this iterator visits: for readers
    /// that would copy the points only to convert them. Owned by the host, valid until a position is set by another
    /// call than rawPositionsToSet(), or this and the handle it was made on are gone. Null, and a failure, when it
    /// stands on no geometry; null for no vertices.
    const double* rawPositions(HStatus* status = nullptr) const;
    /// Where the positions of the whole geometry are set by writing them, laid out as rawPositions() has them: for
    /// deformers that would copy the points only to move each. Every vertex that this iterator visits has to be
    /// written, whatever is there before; the others are there already, and stay. What rawPositions() gave before is
    /// another array, or the same one when positions have been set already, and stays as it is: a loop may read there
    /// and write here, different vertices on different threads. They count as set with the call, and come into the
    /// value of a handle when the iterator is destroyed. Owned by the host, valid until positions are set by another
    /// call or this is gone. Null, and a failure, when it stands on no geometry; null for no vertices.
    double* rawPositionsToSet(HStatus* status = nullptr);
    /// Sets all of them. Fails with kInvalidParameter, and changes nothing, when there are not count() points.
    HStatus setAllPositions(const HPointArray& points, HSpace::Space space = HSpace::kObject);

private:
    friend class OpenQuarn::Access;
    explicit HItGeometry(OpenQuarn::GeometryPoints& points);
    std::shared_ptr<OpenQuarn::GeometryPoints> owned_;
    OpenQuarn::GeometryPoints* impl_ = nullptr;
    unsigned current_ = 0;
    unsigned count_ = 0;
};
