// SPDX-License-Identifier: Apache-2.0
#include "quarn/render/drawJoints.h"

#include "openquarn/HMatrix.h"
#include "openquarn/HPlug.h"
#include "quarn/scene/joints.h"
#include "quarn/scene/plugs.h"

#include <algorithm>
#include <array>
#include <cmath>
#include <optional>
#include <string>

namespace quarn {
namespace {

constexpr Vec3 boneColour{0.12F, 0.35F, 0.75F};
constexpr Vec3 jointColour{0.05F, 0.12F, 0.3F};
constexpr float thinEnd = 0.75F; // radii in pixels of a panel of 480
constexpr float thickEnd = 3.5F;

struct Pixel {
    float x, y;
};

// in the panel; none behind the viewer, or where it cannot be said
std::optional<Pixel> seenAt(const HPoint& place, const Camera& camera, const Layout& layout) {
    const std::array<double, 3> xyz{place.x, place.y, place.z};
    const Vec3 point = camera.toCamera(xyz).front();
    const Pixel pixel{(point.x / -point.z / camera.tangentX + 1.0F) / 2.0F * static_cast<float>(layout.width),
                      (1.0F - point.y / -point.z / camera.tangentY) / 2.0F * static_cast<float>(layout.height)};
    const bool isThere = point.z < 0.0F && std::isfinite(pixel.x) && std::isfinite(pixel.y);
    return isThere ? std::optional(pixel) : std::nullopt;
}

// from a to b, with a radius at each end
void drawStick(Picture& picture, const Layout& layout, int left, Pixel a, float radiusA, Pixel b, float radiusB,
               const Vec3& colour) {
    const float reach = std::max(radiusA, radiusB) + 1.0F;
    const auto within = [](float value, int size) {
        return static_cast<int>(std::clamp(value, 0.0F, static_cast<float>(size)));
    };
    const float dx = b.x - a.x, dy = b.y - a.y, square = dx * dx + dy * dy;
    for (int y = within(std::min(a.y, b.y) - reach, layout.height);
         y < within(std::max(a.y, b.y) + reach, layout.height); ++y)
        for (int x = within(std::min(a.x, b.x) - reach, layout.width);
             x < within(std::max(a.x, b.x) + reach, layout.width); ++x) {
            const float px = static_cast<float>(x) + 0.5F - a.x, py = static_cast<float>(y) + 0.5F - a.y;
            const float along = square > 0.0F ? std::clamp((px * dx + py * dy) / square, 0.0F, 1.0F) : 0.0F;
            const float away = std::hypot(px - along * dx, py - along * dy);
            const float radius = radiusA + (radiusB - radiusA) * along;
            if (const float cover = std::clamp(radius + 0.5F - away, 0.0F, 1.0F); cover > 0.0F)
                picture.paint(left + x, y, colour, cover);
        }
}

} // namespace

std::vector<ShownJoint> shownJoints() {
    std::vector<ShownJoint> shown;
    for (const SceneJoint& joint : sceneJoints()) {
        const HMatrix matrix = matrixOf(plugOf(joint.node, "worldMatrix"));
        shown.push_back({HPoint(matrix(3, 0), matrix(3, 1), matrix(3, 2)), joint.parent});
    }
    return shown;
}

void drawJoints(Picture& picture, const Layout& layout, int left, const Camera& camera,
                const std::vector<ShownJoint>& joints) {
    const float size = static_cast<float>(std::min(layout.width, layout.height)) / 480.0F;
    std::vector<std::optional<Pixel>> pixels;
    pixels.reserve(joints.size());
    for (const ShownJoint& joint : joints)
        pixels.push_back(seenAt(joint.place, camera, layout));
    for (std::size_t joint = 0; joint < joints.size(); ++joint)
        if (const int parent = joints[joint].parent; parent >= 0 && pixels[joint])
            if (const auto& above = pixels[static_cast<std::size_t>(parent)])
                drawStick(picture, layout, left, *above, thickEnd * size, *pixels[joint], thinEnd * size, boneColour);
    for (const std::optional<Pixel>& pixel : pixels)
        if (pixel)
            drawStick(picture, layout, left, *pixel, thickEnd * size, *pixel, thickEnd * size, jointColour);
}

} // namespace quarn
