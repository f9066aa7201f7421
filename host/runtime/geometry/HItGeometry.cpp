// SPDX-License-Identifier: Apache-2.0
#include "openquarn/HItGeometry.h"

#include "core/apiCall.h"
#include "geometry/GeometryPoints.h"

using OpenQuarn::Access;
using OpenQuarn::apiCall;
using OpenQuarn::apiValue;
using OpenQuarn::GeometryPoints;
using OpenQuarn::isRefused;
using OpenQuarn::Operation;

namespace {

void writeBack(GeometryPoints& points) {
    if (points.slot && points.isWritten())
        points.slot->data = points.result();
}

HStatus spaceStatus(HSpace::Space space) {
    if (space == HSpace::kTransform || space == HSpace::kObject || space == HSpace::kWorld)
        return HStatus::kSuccess;
    return {HStatus::kInvalidParameter, "there is no coordinate space with the number " + std::to_string(space)};
}

HStatus placeStatus(const GeometryPoints* points, unsigned position, HSpace::Space space) {
    if (points && position < points->count())
        return spaceStatus(space);
    return {HStatus::kFailure, "the geometry iterator stands beyond its last vertex"};
}

HStatus noGeometry() {
    return {HStatus::kInvalidParameter, "the iterator stands on no geometry"};
}

} // namespace

HItGeometry::HItGeometry(const HDataHandle& geometry, HStatus* status)
    : owned_(apiValue(Operation::HItGeometry_HItGeometry, status, std::shared_ptr<GeometryPoints>(),
                      [&](HStatus& outcome) -> std::shared_ptr<GeometryPoints> {
                          const std::shared_ptr<OpenQuarn::Slot>& slot = Access::impl(geometry);
                          auto mesh = slot ? std::dynamic_pointer_cast<OpenQuarn::MeshData>(slot->data) : nullptr;
                          if (!mesh) {
                              outcome = {HStatus::kInvalidParameter, slot ? "'" + slot->name() + "' holds no mesh"
                                                                          : "the data handle is not valid"};
                              return nullptr;
                          }
                          auto points = std::make_shared<GeometryPoints>(std::move(mesh), nullptr, nullptr);
                          points->slot = slot;
                          return points;
                      }))
    , impl_(owned_.get())
    , count_(impl_ ? impl_->count() : 0U) {}

HItGeometry::HItGeometry(GeometryPoints& points)
    : impl_(&points)
    , count_(points.count()) {}

HItGeometry::~HItGeometry() {
    try {
        if (owned_)
            writeBack(*owned_);
    } catch (...) {
        OpenQuarn::statusOfException("HItGeometry").perror("the points of a geometry are lost");
    }
}

unsigned HItGeometry::index() const {
    return isDone() || isRefused(Operation::HItGeometry_index) ? current_ : impl_->fullIndex(current_);
}

HPoint HItGeometry::position(HSpace::Space space, HStatus* status) const {
    return apiValue(Operation::HItGeometry_position, status, HPoint(), [&](HStatus& outcome) {
        outcome = placeStatus(impl_, current_, space);
        return outcome.error() ? HPoint() : impl_->point(current_);
    });
}

HStatus HItGeometry::setPosition(const HPoint& point, HSpace::Space space) {
    return apiCall(Operation::HItGeometry_setPosition, [&]() -> HStatus {
        HStatus status = placeStatus(impl_, current_, space);
        if (!status.error())
            impl_->setPoint(current_, point);
        return status;
    });
}

HStatus HItGeometry::allPositions(HPointArray& points, HSpace::Space space) const {
    return apiCall(Operation::HItGeometry_allPositions, [&]() -> HStatus {
        const HStatus status = impl_ ? spaceStatus(space) : noGeometry();
        return status.error() ? status : impl_->copyTo(points);
    });
}

const double* HItGeometry::rawPositions(HStatus* status) const {
    const double* none = nullptr;
    return apiValue(Operation::HItGeometry_rawPositions, status, none, [&](HStatus& outcome) {
        outcome = impl_ ? HStatus() : noGeometry();
        return impl_ ? impl_->raw() : nullptr;
    });
}

double* HItGeometry::rawPositionsToSet(HStatus* status) {
    double* none = nullptr;
    return apiValue(Operation::HItGeometry_rawPositionsToSet, status, none, [&](HStatus& outcome) {
        outcome = impl_ ? HStatus() : noGeometry();
        return impl_ ? impl_->rawToSet() : nullptr;
    });
}

HStatus HItGeometry::setAllPositions(const HPointArray& points, HSpace::Space space) {
    return apiCall(Operation::HItGeometry_setAllPositions, [&]() -> HStatus {
        HStatus status = impl_ ? spaceStatus(space) : noGeometry();
        if (status.error())
            return status;
        if (points.length() != count_)
            return {HStatus::kInvalidParameter, "a geometry iterator on " + std::to_string(count_) +
                                                    " vertices cannot set " + std::to_string(points.length()) +
                                                    " positions"};
        impl_->copyFrom(points);
        writeBack(*impl_);
        return HStatus::kSuccess;
    });
}
