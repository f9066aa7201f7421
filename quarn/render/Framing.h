// SPDX-License-Identifier: Apache-2.0
// Where the camera stands so that everything is seen.
//
// Camera space: the viewer at the origin, x to the right, y up, looking along -z; its unit is the distance from the
// viewer to the middle of what is framed.
#pragma once

#include "quarn/render/Vec3.h"
#include "quarn/render/View.h"

#include <array>
#include <limits>
#include <span>
#include <vector>

namespace quarn {

/// A perspective camera; the picture reaches from -tangentX to tangentX, and from -tangentY to tangentY, at z = -1.
struct Camera {
    View view;
    HVector position; ///< object space
    double unit = 1.0;
    float tangentX = 1.0F;
    float tangentY = 1.0F;

    /// From object space, x, y, z of each vertex, to camera space.
    std::vector<Vec3> toCamera(std::span<const double> xyz) const;
    /// The same of a direction, whose length stays.
    Vec3 directionToCamera(const HVector& direction) const;
};

/// Parts of the picture's width and height that stay free.
struct Margins {
    double sides = 0.05;
    double top = 0.05;
    double bottom = 0.05;
};

/// Finds the nearest camera of a view that sees some points, within the margins. The sides of what a camera sees have
/// directions that do not depend on where it stands; so it is enough to know how far the points reach in those four.
class Framing {
public:
    /// How far points reach to the sides of the picture, and along the view.
    struct Reach {
        std::array<double, 4> sides{-infinity, -infinity, -infinity, -infinity}; ///< right, left, top, bottom
        double nearest = -infinity;                                              ///< along the view's `viewer`
        double farthest = infinity;

        void include(const Reach& other);
        bool isEmpty() const { return nearest < farthest; }
    };

    /// `width`, `height` of the picture, above 0; the shorter one spans 35 degrees.
    Framing(const View& view, int width, int height, const Margins& margins);
    /// Of one point, finite, in object space.
    Reach reachOf(const HVector& point) const;
    /// Where to stand to see it all. Without any extent, a camera that stands one unit away.
    Camera camera(const Reach& reach) const;

private:
    static constexpr double infinity = std::numeric_limits<double>::infinity();

    View view_;
    double tangentX_;
    double tangentY_;
    std::array<double, 3> tangents_{}; ///< of the free parts: to both sides, to the top, to the bottom
};

} // namespace quarn
