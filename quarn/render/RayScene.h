// SPDX-License-Identifier: Apache-2.0
// What rays meet, by Embree.
#pragma once

#include "quarn/render/Surface.h"

#include <memory>
#include <optional>

namespace quarn {

/// Where a ray meets the surface first.
struct Hit {
    std::uint32_t triangle = 0;
    float u = 0.0F; ///< weight of the triangle's second corner
    float v = 0.0F; ///< weight of its third
    float distance = 0.0F;
    Vec3 normal; ///< of the triangle, unit length
};

/// A surface prepared for rays. Throws std::runtime_error when the memory is not enough. What is built does not depend
/// on the number of threads. Thread: made by one; rays by any.
class RayScene {
public:
    explicit RayScene(const Surface& surface);
    ~RayScene();
    RayScene(const RayScene&) = delete;
    RayScene& operator=(const RayScene&) = delete;

    /// `direction` need not have unit length; distances are counted in it.
    std::optional<Hit> nearest(const Vec3& origin, const Vec3& direction) const;
    bool isBlocked(const Vec3& origin, const Vec3& direction, float distance) const;

private:
    struct Impl;
    std::unique_ptr<Impl> impl_;
};

} // namespace quarn
