// SPDX-License-Identifier: Apache-2.0
#include "quarn/render/RayScene.h"

#include <embree3/rtcore.h>
#include <oneapi/tbb/task_arena.h>

#include <algorithm>
#include <limits>
#include <stdexcept>

namespace quarn {
namespace {

RTCRay makeRay(const Vec3& origin, const Vec3& direction, float distance) {
    RTCRay ray{};
    ray.org_x = origin.x;
    ray.org_y = origin.y;
    ray.org_z = origin.z;
    ray.dir_x = direction.x;
    ray.dir_y = direction.y;
    ray.dir_z = direction.z;
    ray.tfar = distance;
    ray.mask = ~0U;
    return ray;
}

// Embree's own buffers have the padding that it asks for
template <class Item>
void fillBuffer(RTCGeometry geometry, RTCBufferType type, RTCFormat format, const std::vector<Item>& items) {
    void* buffer = rtcSetNewGeometryBuffer(geometry, type, 0, format, sizeof(Item), items.size());
    if (buffer != nullptr)
        std::copy(items.begin(), items.end(), static_cast<Item*>(buffer));
}

} // namespace

struct RayScene::Impl {
    Impl() = default;
    Impl(const Impl&) = delete;
    Impl& operator=(const Impl&) = delete;
    ~Impl() {
        rtcReleaseScene(scene);
        rtcReleaseDevice(device);
    }
    void attach(const Surface& surface) {
        RTCGeometry geometry = rtcNewGeometry(device, RTC_GEOMETRY_TYPE_TRIANGLE);
        fillBuffer(geometry, RTC_BUFFER_TYPE_VERTEX, RTC_FORMAT_FLOAT3, surface.points);
        fillBuffer(geometry, RTC_BUFFER_TYPE_INDEX, RTC_FORMAT_UINT3, surface.triangles);
        rtcCommitGeometry(geometry);
        rtcAttachGeometry(scene, geometry);
        rtcReleaseGeometry(geometry);
    }
    void requireNoError() const {
        if (const RTCError error = rtcGetDeviceError(device); error != RTC_ERROR_NONE)
            throw std::runtime_error("the mesh cannot be prepared for tracing: Embree has error " +
                                     std::to_string(static_cast<int>(error)) +
                                     (error == RTC_ERROR_OUT_OF_MEMORY ? ", out of memory" : ""));
    }

    RTCDevice device = rtcNewDevice(nullptr);
    RTCScene scene = rtcNewScene(device);
};

RayScene::RayScene(const Surface& surface)
    : impl_(std::make_unique<Impl>()) {
    rtcSetSceneFlags(impl_->scene, RTC_SCENE_FLAG_ROBUST);
    if (!surface.triangles.empty())
        impl_->attach(surface);
    // one thread builds: with several, which of two triangles a ray through their common edge meets could change
    oneapi::tbb::task_arena(1).execute([this] { rtcCommitScene(impl_->scene); });
    impl_->requireNoError();
}

RayScene::~RayScene() = default;

std::optional<Hit> RayScene::nearest(const Vec3& origin, const Vec3& direction) const {
    RTCRayHit query{};
    query.ray = makeRay(origin, direction, std::numeric_limits<float>::infinity());
    query.hit.geomID = RTC_INVALID_GEOMETRY_ID;
    RTCIntersectContext context;
    rtcInitIntersectContext(&context);
    rtcIntersect1(impl_->scene, &context, &query);
    if (query.hit.geomID == RTC_INVALID_GEOMETRY_ID)
        return {};
    const RTCHit& hit = query.hit;
    return Hit{hit.primID, hit.u, hit.v, query.ray.tfar, normalized({hit.Ng_x, hit.Ng_y, hit.Ng_z})};
}

bool RayScene::isBlocked(const Vec3& origin, const Vec3& direction, float distance) const {
    RTCRay ray = makeRay(origin, direction, distance);
    RTCIntersectContext context;
    rtcInitIntersectContext(&context);
    rtcOccluded1(impl_->scene, &context, &ray);
    return ray.tfar < 0.0F;
}

} // namespace quarn
